#include "core/media/pixelkernels_p.h"

#include <cstdint>
#include <cstring>

#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "core/media/pixelkernels.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

HWY_BEFORE_NAMESPACE();
namespace qvpixels {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

// Words are moved as bytes, so that their addresses may be odd.
inline uint32_t wordAt(const Byte* from, size_t i) {
    uint16_t word;
    std::memcpy(&word, from + 2 * i, 2);
    return word;
}

inline void putWord(Byte* to, size_t i, uint32_t value) {
    const auto word = static_cast<uint16_t>(value);
    std::memcpy(to + 2 * i, &word, 2);
}

inline uint32_t lerpOne(int shift, uint32_t dst, uint32_t src, uint32_t weight) {
    return (dst * ((1u << shift) - weight) + src * weight) >> shift;
}

inline uint32_t weightOf(Byte mask) { return (mask + 1u) >> 1; }

// Each of the next functions works on whole vectors and returns how many samples it has done.
#if HWY_TARGET == HWY_SCALAR

constexpr auto noVectors = [](auto&&...) -> size_t { return 0; };
constexpr auto averageByteVectors = noVectors, averageWordVectors = noVectors;
constexpr auto maskByteVectors = noVectors, maskWordVectors = noVectors;
constexpr auto mixByteVectors = noVectors, mixWordVectors = noVectors;
template <int copies>
constexpr auto spreadVectors = noVectors;

#else

constexpr hn::ScalableTag<uint8_t> d8;
using D8 = decltype(d8);
constexpr hn::RepartitionToWide<D8> d16;
using D16 = decltype(d16);
constexpr hn::RepartitionToWide<D16> d32;
using V8 = hn::Vec<D8>;
using V16 = hn::Vec<D16>;

HWY_INLINE V16 loadWords(const Byte* from) { return hn::BitCast(d16, hn::LoadU(d8, from)); }

HWY_INLINE void storeWords(V16 words, Byte* to) { hn::StoreU(hn::BitCast(d8, words), d8, to); }

// dst + (src - dst) * weight, with `shift` fraction bits of the weight. Intermediate values wrap; the sum
// fits.
template <int shift, class V>
HWY_INLINE V lerp(V dst, V src, V weight) {
    return hn::ShiftRight<shift>(hn::Add(hn::ShiftLeft<shift>(dst), hn::Mul(hn::Sub(src, dst), weight)));
}

// Even and odd samples are worked on apart in lanes of twice the width, so that nothing crosses lanes.
template <int shift>
HWY_INLINE V8 lerpBytes(V8 dst, V8 src, V8 weight) {
    const auto low = hn::Set(d16, 255);
    const auto t = hn::BitCast(d16, dst), s = hn::BitCast(d16, src), w = hn::BitCast(d16, weight);
    const auto even = lerp<shift>(hn::And(t, low), hn::And(s, low), hn::And(w, low));
    const auto odd = lerp<shift>(hn::ShiftRight<8>(t), hn::ShiftRight<8>(s), hn::ShiftRight<8>(w));
    return hn::BitCast(d8, hn::Or(even, hn::ShiftLeft<8>(odd)));
}

template <int shift>
HWY_INLINE V16 lerpWords(V16 dst, V16 src, V16 weight) {
    const auto low = hn::Set(d32, 65535);
    const auto t = hn::BitCast(d32, dst), s = hn::BitCast(d32, src), w = hn::BitCast(d32, weight);
    const auto even = lerp<shift>(hn::And(t, low), hn::And(s, low), hn::And(w, low));
    const auto odd = lerp<shift>(hn::ShiftRight<16>(t), hn::ShiftRight<16>(s), hn::ShiftRight<16>(w));
    return hn::BitCast(d16, hn::Or(even, hn::ShiftLeft<16>(odd)));
}

size_t averageByteVectors(Byte* dst, const Byte* a, const Byte* b, size_t bytes) {
    const size_t lanes = hn::Lanes(d8);
    size_t i = 0;
    for (; i + lanes <= bytes; i += lanes) {
        const auto x = hn::LoadU(d8, a + i), y = hn::LoadU(d8, b + i);
        // The shift is on pairs of bytes: the bit that comes down from the upper one is masked off.
        const auto half = hn::BitCast(d8, hn::ShiftRight<1>(hn::BitCast(d16, hn::Xor(x, y))));
        hn::StoreU(hn::Add(hn::And(x, y), hn::And(half, hn::Set(d8, 127))), d8, dst + i);
    }
    return i;
}

size_t averageWordVectors(Byte* dst, const Byte* a, const Byte* b, size_t words) {
    const size_t lanes = hn::Lanes(d16);
    size_t i = 0;
    for (; i + lanes <= words; i += lanes) {
        const auto x = loadWords(a + 2 * i), y = loadWords(b + 2 * i);
        storeWords(hn::Add(hn::And(x, y), hn::ShiftRight<1>(hn::Xor(x, y))), dst + 2 * i);
    }
    return i;
}

size_t maskByteVectors(Byte* dst, const Byte* src, const Byte* mask, size_t bytes) {
    const size_t lanes = hn::Lanes(d8);
    size_t i = 0;
    for (; i + lanes <= bytes; i += lanes) {
        const auto weight = hn::AverageRound(hn::LoadU(d8, mask + i), hn::Zero(d8));
        hn::StoreU(lerpBytes<7>(hn::LoadU(d8, dst + i), hn::LoadU(d8, src + i), weight), d8, dst + i);
    }
    return i;
}

size_t maskWordVectors(Byte* dst, const Byte* src, const Byte* mask, size_t words) {
    const hn::Rebind<uint8_t, D16> half;
    const size_t lanes = hn::Lanes(d16);
    size_t i = 0;
    for (; i + lanes <= words; i += lanes) {
        const auto weight = hn::AverageRound(hn::PromoteTo(d16, hn::LoadU(half, mask + i)), hn::Zero(d16));
        storeWords(lerpWords<7>(loadWords(dst + 2 * i), loadWords(src + 2 * i), weight), dst + 2 * i);
    }
    return i;
}

size_t mixByteVectors(Byte* dst, const Byte* src, int alpha, size_t bytes) {
    const size_t lanes = hn::Lanes(d8);
    const auto weight = hn::Set(d8, static_cast<uint8_t>(alpha));
    size_t i = 0;
    for (; i + lanes <= bytes; i += lanes)
        hn::StoreU(lerpBytes<8>(hn::LoadU(d8, dst + i), hn::LoadU(d8, src + i), weight), d8, dst + i);
    return i;
}

size_t mixWordVectors(Byte* dst, const Byte* src, int alpha, size_t words) {
    const size_t lanes = hn::Lanes(d16);
    const auto weight = hn::Set(d16, static_cast<uint16_t>(alpha));
    size_t i = 0;
    for (; i + lanes <= words; i += lanes)
        storeWords(lerpWords<8>(loadWords(dst + 2 * i), loadWords(src + 2 * i), weight), dst + 2 * i);
    return i;
}

template <int copies>
size_t spreadVectors(Byte* dst, const Byte* mask, size_t step, size_t pixels) {
    const size_t lanes = hn::Lanes(d8);
    size_t i = 0;
    for (; i + lanes <= pixels; i += lanes) {
        V8 v = hn::Undefined(d8), unused;
        if (step == 1)
            v = hn::LoadU(d8, mask + i);
        else
            hn::LoadInterleaved2(d8, mask + 2 * i, v, unused);
        if constexpr (copies == 1)
            hn::StoreU(v, d8, dst + i);
        else if constexpr (copies == 2)
            hn::StoreInterleaved2(v, v, d8, dst + 2 * i);
        else if constexpr (copies == 3)
            hn::StoreInterleaved3(v, v, v, d8, dst + 3 * i);
        else
            hn::StoreInterleaved4(v, v, v, v, d8, dst + 4 * i);
    }
    return i;
}

#endif

void averageBytes(Byte* dst, const Byte* a, const Byte* b, size_t bytes) {
    for (size_t i = averageByteVectors(dst, a, b, bytes); i < bytes; ++i)
        dst[i] = static_cast<Byte>((a[i] + b[i]) >> 1);
}

void averageWords(Byte* dst, const Byte* a, const Byte* b, size_t words) {
    for (size_t i = averageWordVectors(dst, a, b, words); i < words; ++i)
        putWord(dst, i, (wordAt(a, i) + wordAt(b, i)) >> 1);
}

void maskBytes(Byte* dst, const Byte* src, const Byte* mask, size_t bytes) {
    for (size_t i = maskByteVectors(dst, src, mask, bytes); i < bytes; ++i)
        dst[i] = static_cast<Byte>(lerpOne(7, dst[i], src[i], weightOf(mask[i])));
}

void maskWords(Byte* dst, const Byte* src, const Byte* mask, size_t words) {
    for (size_t i = maskWordVectors(dst, src, mask, words); i < words; ++i)
        putWord(dst, i, lerpOne(7, wordAt(dst, i), wordAt(src, i), weightOf(mask[i])));
}

void mixBytes(Byte* dst, const Byte* src, int alpha, size_t bytes) {
    const auto weight = static_cast<uint32_t>(alpha);
    for (size_t i = mixByteVectors(dst, src, alpha, bytes); i < bytes; ++i)
        dst[i] = static_cast<Byte>(lerpOne(8, dst[i], src[i], weight));
}

void mixWords(Byte* dst, const Byte* src, int alpha, size_t words) {
    const auto weight = static_cast<uint32_t>(alpha);
    for (size_t i = mixWordVectors(dst, src, alpha, words); i < words; ++i)
        putWord(dst, i, lerpOne(8, wordAt(dst, i), wordAt(src, i), weight));
}

template <int copies>
void spread(Byte* dst, const Byte* mask, size_t step, size_t pixels) {
    for (size_t i = spreadVectors<copies>(dst, mask, step, pixels); i < pixels; ++i)
        std::memset(dst + copies * i, mask[step * i], copies);
}

void spreadMask(Byte* dst, const Byte* mask, int step, int copies, size_t pixels) {
    const auto every = static_cast<size_t>(step);
    switch (copies) {
        case 1: return spread<1>(dst, mask, every, pixels);
        case 2: return spread<2>(dst, mask, every, pixels);
        case 3: return spread<3>(dst, mask, every, pixels);
        default: return spread<4>(dst, mask, every, pixels);
    }
}

const char* vectorUnit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace qvpixels
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace qvpixels {

HWY_EXPORT(averageBytes);
HWY_EXPORT(averageWords);
HWY_EXPORT(maskBytes);
HWY_EXPORT(maskWords);
HWY_EXPORT(mixBytes);
HWY_EXPORT(mixWords);
HWY_EXPORT(spreadMask);
HWY_EXPORT(vectorUnit);

void averageBytes(Byte* dst, const Byte* a, const Byte* b, std::size_t bytes) {
    HWY_DYNAMIC_DISPATCH(averageBytes)(dst, a, b, bytes);
}

void averageWords(Byte* dst, const Byte* a, const Byte* b, std::size_t words) {
    HWY_DYNAMIC_DISPATCH(averageWords)(dst, a, b, words);
}

void maskBytes(Byte* dst, const Byte* src, const Byte* mask, std::size_t bytes) {
    HWY_DYNAMIC_DISPATCH(maskBytes)(dst, src, mask, bytes);
}

void maskWords(Byte* dst, const Byte* src, const Byte* mask, std::size_t words) {
    HWY_DYNAMIC_DISPATCH(maskWords)(dst, src, mask, words);
}

void mixBytes(Byte* dst, const Byte* src, int alpha, std::size_t bytes) {
    HWY_DYNAMIC_DISPATCH(mixBytes)(dst, src, alpha, bytes);
}

void mixWords(Byte* dst, const Byte* src, int alpha, std::size_t words) {
    HWY_DYNAMIC_DISPATCH(mixWords)(dst, src, alpha, words);
}

void spreadMask(Byte* dst, const Byte* mask, int step, int copies, std::size_t pixels) {
    HWY_DYNAMIC_DISPATCH(spreadMask)(dst, mask, step, copies, pixels);
}

const char* vectorUnit() { return HWY_DYNAMIC_DISPATCH(vectorUnit)(); }

}  // namespace qvpixels
#endif
