#include "builtin/kernels/lines/rows16.h"

#include <algorithm>
#include <bit>
#include <cstring>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/lines/rows16.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/lines/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

constexpr uint16_t opaque = 65535, neutral = 32768;

HWY_INLINE uint32_t doubleAt(const Byte* from, size_t i) {
    uint32_t word;
    std::memcpy(&word, from + 4 * i, 4);
    return word;
}
HWY_INLINE void putDouble(Byte* to, size_t i, uint32_t word) { std::memcpy(to + 4 * i, &word, 4); }

// Samples of 10 bits fill 16 with zeros below, and are rounded on the way back.
HWY_INLINE uint16_t raise10(uint32_t value) { return static_cast<uint16_t>((value & 1023) << 6); }
HWY_INLINE uint32_t lower10(unsigned value) { return std::min((value + 32) >> 6, 1023u); }
HWY_INLINE unsigned fit(unsigned value, bool ten) { return ten ? lower10(value) << 6 : value; }

#if QV_VECTORS
using VU16 = hn::Vec<decltype(hn::Repartition<uint16_t, D8>())>;
HWY_INLINE size_t words() { return hn::Lanes(du16); }
HWY_INLINE VU16 loadPacked(const Byte* from) { return hn::BitCast(du16, hn::LoadU(d8, from)); }
HWY_INLINE void putPacked(VU16 v, Byte* to) { hn::StoreU(hn::BitCast(d8, v), d8, to); }
HWY_INLINE VU16 fitWords(VU16 v, bool ten) {
    return ten ? hn::And(hn::SaturatedAdd(v, hn::Set(du16, 32)), hn::Set(du16, 0xFFC0)) : v;
}
const uint16_t* wordsOf(const Byte* from) { return reinterpret_cast<const uint16_t*>(from); }
uint16_t* wordsOf(Byte* to) { return reinterpret_cast<uint16_t*>(to); }
#endif

void splitWords4(const Byte* from, uint16_t* a, uint16_t* b, uint16_t* c, uint16_t* d, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + words() <= n; i += words()) {
        VU16 va, vb, vc, vd;
        hn::LoadInterleaved4(du16, wordsOf(from + 8 * i), va, vb, vc, vd);
        hn::StoreU(va, du16, a + i);
        hn::StoreU(vb, du16, b + i);
        hn::StoreU(vc, du16, c + i);
        if (d) hn::StoreU(vd, du16, d + i);
    }
#endif
    for (; i < n; ++i) {
        a[i] = wordAt(from, 4 * i);
        b[i] = wordAt(from, 4 * i + 1);
        c[i] = wordAt(from, 4 * i + 2);
        if (d) d[i] = wordAt(from, 4 * i + 3);
    }
}

void joinWords4(Byte* to, const uint16_t* a, const uint16_t* b, const uint16_t* c, const uint16_t* d,
                size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + words() <= n; i += words())
        hn::StoreInterleaved4(hn::LoadU(du16, a + i), hn::LoadU(du16, b + i), hn::LoadU(du16, c + i),
                              d ? hn::LoadU(du16, d + i) : hn::Set(du16, opaque), du16, wordsOf(to + 8 * i));
#endif
    for (; i < n; ++i) {
        putWord(to, 4 * i, a[i]);
        putWord(to, 4 * i + 1, b[i]);
        putWord(to, 4 * i + 2, c[i]);
        putWord(to, 4 * i + 3, d ? d[i] : opaque);
    }
}

void splitWords422(const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, size_t n, bool lumaFirst) {
    const size_t pairs = n / 2, at = lumaFirst ? 0 : 1;
    size_t i = 0;
#if QV_VECTORS
    for (; i + words() <= pairs; i += words()) {
        const Byte* group = from + 8 * i;
        const size_t bytes = 2 * words();
        const auto a = loadPacked(group), b = loadPacked(group + bytes);
        const auto c = loadPacked(group + 2 * bytes), d = loadPacked(group + 3 * bytes);
        const auto evenAb = hn::ConcatEven(du16, b, a), oddAb = hn::ConcatOdd(du16, b, a);
        const auto evenCd = hn::ConcatEven(du16, d, c), oddCd = hn::ConcatOdd(du16, d, c);
        hn::StoreU(lumaFirst ? evenAb : oddAb, du16, y + 2 * i);
        hn::StoreU(lumaFirst ? evenCd : oddCd, du16, y + 2 * i + words());
        const auto low = lumaFirst ? oddAb : evenAb, high = lumaFirst ? oddCd : evenCd;
        hn::StoreU(hn::ConcatEven(du16, high, low), du16, u + i);
        hn::StoreU(hn::ConcatOdd(du16, high, low), du16, v + i);
    }
#endif
    for (; i < pairs; ++i) {
        y[2 * i] = wordAt(from, 4 * i + at);
        y[2 * i + 1] = wordAt(from, 4 * i + 2 + at);
        u[i] = wordAt(from, 4 * i + 1 - at);
        v[i] = wordAt(from, 4 * i + 3 - at);
    }
    if (n & 1) y[n - 1] = wordAt(from, 4 * pairs + at);
}

void joinWords422(Byte* to, const uint16_t* y, const uint16_t* u, const uint16_t* v, size_t n, bool lumaFirst,
                  bool ten) {
    const size_t pairs = n / 2, at = lumaFirst ? 0 : 1;
    size_t i = 0;
#if QV_VECTORS
    const hn::Half<decltype(hn::Repartition<uint16_t, D8>())> half;
    const hn::Repartition<uint32_t, D8> du32;
    for (; i + words() / 2 <= pairs; i += words() / 2) {
        const auto wu = hn::PromoteTo(du32, hn::LoadU(half, u + i)),
                   wv = hn::PromoteTo(du32, hn::LoadU(half, v + i));
        const auto chroma = fitWords(hn::BitCast(du16, hn::Or(wu, hn::ShiftLeft<16>(wv))), ten);
        const auto luma = fitWords(hn::LoadU(du16, y + 2 * i), ten);
        if (lumaFirst)
            hn::StoreInterleaved2(luma, chroma, du16, wordsOf(to + 8 * i));
        else
            hn::StoreInterleaved2(chroma, luma, du16, wordsOf(to + 8 * i));
    }
#endif
    for (; i < pairs; ++i) {
        putWord(to, 4 * i + at, fit(y[2 * i], ten));
        putWord(to, 4 * i + 2 + at, fit(y[2 * i + 1], ten));
        putWord(to, 4 * i + 1 - at, fit(u[i], ten));
        putWord(to, 4 * i + 3 - at, fit(v[i], ten));
    }
    if (n & 1) {
        putWord(to, 4 * pairs + at, fit(y[n - 1], ten));
        putWord(to, 4 * pairs + 1 - at, fit(pairs ? u[pairs - 1] : neutral, ten));
    }
}

void splitWords2(const Byte* from, uint16_t* a, uint16_t* b, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + words() <= n; i += words()) {
        const auto low = loadPacked(from + 4 * i), high = loadPacked(from + 4 * i + 2 * words());
        hn::StoreU(hn::ConcatEven(du16, high, low), du16, a + i);
        hn::StoreU(hn::ConcatOdd(du16, high, low), du16, b + i);
    }
#endif
    for (; i < n; ++i) {
        a[i] = wordAt(from, 2 * i);
        b[i] = wordAt(from, 2 * i + 1);
    }
}

void joinWords2(Byte* to, const uint16_t* a, const uint16_t* b, size_t n, bool ten) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + words() <= n; i += words())
        hn::StoreInterleaved2(fitWords(hn::LoadU(du16, a + i), ten), fitWords(hn::LoadU(du16, b + i), ten),
                              du16, wordsOf(to + 4 * i));
#endif
    for (; i < n; ++i) {
        putWord(to, 2 * i, fit(a[i], ten));
        putWord(to, 2 * i + 1, fit(b[i], ten));
    }
}

void raiseWords(uint16_t* to, const Byte* from, size_t n, int depth) {
    const int shift = 16 - depth;
    size_t i = 0;
#if QV_VECTORS
    for (; i + words() <= n; i += words())
        hn::StoreU(hn::ShiftLeftSame(loadPacked(from + 2 * i), shift), du16, to + i);
#endif
    for (; i < n; ++i) to[i] = static_cast<uint16_t>(wordAt(from, i) << shift);
}

void lowerWords(Byte* to, const uint16_t* from, size_t n, int depth) {
    const int shift = 16 - depth;
    const unsigned half = shift ? 1u << (shift - 1) : 0;
    size_t i = 0;
#if QV_VECTORS
    const auto halves = hn::Set(du16, static_cast<uint16_t>(half));
    for (; i + words() <= n; i += words())
        putPacked(hn::ShiftRightSame(hn::SaturatedAdd(hn::LoadU(du16, from + i), halves), shift), to + 2 * i);
#endif
    for (; i < n; ++i) putWord(to, i, std::min(from[i] + half, 65535u) >> shift);
}

void roundWords(Byte* to, const uint16_t* from, size_t n, bool ten) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + words() <= n; i += words()) putPacked(fitWords(hn::LoadU(du16, from + i), ten), to + 2 * i);
#endif
    for (; i < n; ++i) putWord(to, i, fit(from[i], ten));
}

#if QV_VECTORS
// Groups of v210 are moved one at a time, in blocks of 16 bytes.
const hn::Full128<uint8_t> block8;
const hn::Full128<uint16_t> block16;
const hn::Full128<uint32_t> block32;
using Block8 = hn::Vec<hn::Full128<uint8_t>>;
constexpr Byte none = 0x80;
// The two bytes that hold each sample: luma; U, a spare word, V, a spare word.
alignas(16) constexpr Byte lumaBytes[16] = {1, 2, 4, 5, 6, 7, 9, 10, 12, 13, 14, 15, none, none, none, none};
alignas(16) constexpr Byte chromaBytes[16] = {0, 1, 5, 6, 10, 11, none, none, 2, 3, 8, 9, 13, 14, none, none};
// Which bring the samples, 2 and 4 bits or none too high or low, to the upper ten bits.
alignas(16) constexpr uint16_t lumaFactors[8] = {16, 64, 4, 16, 64, 4, 0, 0};
alignas(16) constexpr uint16_t chromaFactors[8] = {64, 16, 4, 0, 4, 64, 16, 0};
// The lower two samples of each double word, from luma and from chroma; and the upper one.
alignas(16) constexpr Byte pairsOfLuma[16] = {none, none, 0, 1, 2, 3, none, none,
                                              none, none, 6, 7, 8, 9, none, none};
alignas(16) constexpr Byte pairsOfChroma[16] = {0,  1,  none, none, none, none, 2,  3,
                                                10, 11, none, none, none, none, 12, 13};
alignas(16) constexpr Byte upperOfLuma[16] = {none, none, none, none, 4,  5,  none, none,
                                              none, none, none, none, 10, 11, none, none};
alignas(16) constexpr Byte upperOfChroma[16] = {8, 9, none, none, none, none, none, none,
                                                4, 5, none, none, none, none, none, none};

HWY_INLINE Block8 pick(Block8 from, const Byte* order) {
    return hn::TableLookupBytesOr0(from, hn::Load(block8, order));
}
#endif

constexpr size_t groupPixels = 6, groupBytes = 16;

void splitV210(const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, size_t n) {
    size_t x = 0;
#if QV_VECTORS
    const hn::Half<decltype(hn::Full128<uint16_t>())> half;
    const auto mask = hn::Set(block16, 0xFFC0);
    const auto lumaFactor = hn::Load(block16, lumaFactors), chromaFactor = hn::Load(block16, chromaFactors);
    // Two more samples than a group has are written, and overwritten then.
    for (; x + 8 <= n; x += groupPixels, from += groupBytes) {
        const auto group = hn::LoadU(block8, from);
        const auto luma = hn::Mul(hn::BitCast(block16, pick(group, lumaBytes)), lumaFactor);
        const auto chroma =
            hn::And(hn::Mul(hn::BitCast(block16, pick(group, chromaBytes)), chromaFactor), mask);
        hn::StoreU(hn::And(luma, mask), block16, y + x);
        hn::StoreU(hn::LowerHalf(half, chroma), half, u + x / 2);
        hn::StoreU(hn::UpperHalf(half, chroma), half, v + x / 2);
    }
#endif
    for (; x < n; x += groupPixels, from += groupBytes) {
        uint16_t s[12];
        for (size_t w = 0; w < 4; ++w)
            for (size_t k = 0; k < 3; ++k) s[3 * w + k] = raise10(doubleAt(from, w) >> 10 * k);
        const size_t pixels = std::min(groupPixels, n - x);
        for (size_t i = 0; i < pixels; ++i) y[x + i] = s[2 * i + 1];
        for (size_t i = 0; i < pixels / 2; ++i) {
            u[x / 2 + i] = s[4 * i];
            v[x / 2 + i] = s[4 * i + 2];
        }
    }
}

void joinV210(Byte* to, const uint16_t* y, const uint16_t* u, const uint16_t* v, size_t n) {
    const size_t pairs = n / 2;
    size_t x = 0;
#if QV_VECTORS
    const hn::Half<decltype(hn::Full128<uint16_t>())> half;
    const auto round = hn::Set(block16, 32);
    const auto low = hn::Set(block32, 1023), middle = hn::Set(block32, 1023 << 10);
    for (; x + 8 <= n; x += groupPixels, to += groupBytes) {
        const auto words = hn::LoadU(block16, y + x);
        const auto chromaWords = hn::Combine(block16, hn::LoadU(half, v + x / 2), hn::LoadU(half, u + x / 2));
        const auto luma = hn::BitCast(block8, hn::ShiftRight<6>(hn::SaturatedAdd(words, round)));
        const auto chroma = hn::BitCast(block8, hn::ShiftRight<6>(hn::SaturatedAdd(chromaWords, round)));
        const auto lower = hn::BitCast(block32, hn::Or(pick(luma, pairsOfLuma), pick(chroma, pairsOfChroma)));
        const auto upper = hn::BitCast(block32, hn::Or(pick(luma, upperOfLuma), pick(chroma, upperOfChroma)));
        const auto both = hn::Or(hn::And(lower, low), hn::And(hn::ShiftRight<6>(lower), middle));
        hn::StoreU(hn::BitCast(block8, hn::Or(both, hn::ShiftLeft<20>(upper))), block8, to);
    }
#endif
    for (; x < n; x += groupPixels, to += groupBytes) {
        uint32_t s[12] = {};
        const size_t pixels = std::min(groupPixels, n - x);
        for (size_t i = 0; i < pixels; ++i) s[2 * i + 1] = lower10(y[x + i]);
        for (size_t i = 0; i < (pixels + 1) / 2; ++i) {
            const size_t at = std::min(x / 2 + i + 1, pairs);
            s[4 * i] = lower10(at ? u[at - 1] : neutral);
            s[4 * i + 2] = lower10(at ? v[at - 1] : neutral);
        }
        for (size_t w = 0; w < 4; ++w) putDouble(to, w, s[3 * w] | s[3 * w + 1] << 10 | s[3 * w + 2] << 20);
    }
}

#if QV_VECTORS
const hn::Repartition<uint32_t, D8> du32;
using VU32 = hn::Vec<decltype(hn::Repartition<uint32_t, D8>())>;
const hn::Rebind<uint16_t, decltype(hn::Repartition<uint32_t, D8>())> halfWords;
HWY_INLINE void putTens(VU32 samples, uint16_t* to) {
    hn::StoreU(hn::DemoteTo(halfWords, hn::BitCast(d32, samples)), halfWords, to);
}
HWY_INLINE VU32 lowerTens(const uint16_t* from) {
    return hn::PromoteTo(
        du32, hn::ShiftRight<6>(hn::SaturatedAdd(hn::LoadU(halfWords, from), hn::Set(halfWords, 32))));
}
#endif

void splitTens(const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, uint16_t* a, size_t n, int low) {
    size_t i = 0;
#if QV_VECTORS
    const auto mask = hn::Set(du32, 1023 << 6);
    for (; i + hn::Lanes(du32) <= n; i += hn::Lanes(du32)) {
        const auto word = hn::BitCast(du32, hn::LoadU(d8, from + 4 * i));
        const auto fields = hn::ShiftRightSame(word, low);
        putTens(hn::And(hn::ShiftLeft<6>(fields), mask), u + i);
        putTens(hn::And(hn::ShiftRight<4>(fields), mask), y + i);
        putTens(hn::And(hn::ShiftRight<14>(fields), mask), v + i);
        if (low == 0 && a) putTens(hn::Mul(hn::ShiftRight<30>(word), hn::Set(du32, 0x5555)), a + i);
    }
#endif
    for (; i < n; ++i) {
        const uint32_t word = doubleAt(from, i), fields = word >> low;
        u[i] = raise10(fields);
        y[i] = raise10(fields >> 10);
        v[i] = raise10(fields >> 20);
        if (low == 0 && a) a[i] = static_cast<uint16_t>((word >> 30) * 0x5555);
    }
}

void joinTens(Byte* to, const uint16_t* y, const uint16_t* u, const uint16_t* v, const uint16_t* a, size_t n,
              int low) {
    size_t i = 0;
#if QV_VECTORS
    const auto opaqueBits = hn::Set(du32, low ? 0 : 3u << 30);
    for (; i + hn::Lanes(du32) <= n; i += hn::Lanes(du32)) {
        const auto sum = hn::Or(hn::Or(lowerTens(u + i), hn::ShiftLeft<10>(lowerTens(y + i))),
                                hn::ShiftLeft<20>(lowerTens(v + i)));
        auto alpha = opaqueBits;
        if (low == 0 && a) {
            // round(3 a / 65535)
            const auto three =
                hn::Add(hn::Mul(hn::PromoteTo(du32, hn::LoadU(halfWords, a + i)), hn::Set(du32, 3)),
                        hn::Set(du32, 32768));
            alpha = hn::ShiftLeft<30>(hn::ShiftRight<16>(hn::Add(three, hn::ShiftRight<16>(three))));
        }
        putPacked(hn::BitCast(du16, hn::Or(hn::ShiftLeftSame(sum, low), alpha)), to + 4 * i);
    }
#endif
    for (; i < n; ++i) {
        const uint32_t sum = lower10(u[i]) | lower10(y[i]) << 10 | lower10(v[i]) << 20;
        const uint32_t alpha = a ? (a[i] * 3u + 32767) / 65535 : 3;
        putDouble(to, i, low ? sum << low : sum | alpha << 30);
    }
}

#if QV_VECTORS
const hn::Repartition<float, D8> df;
using VF = hn::Vec<decltype(hn::Repartition<float, D8>())>;
HWY_INLINE void putSamples(VF value, FloatScale scale, uint16_t* to) {
    value =
        hn::Add(hn::Add(hn::Mul(value, hn::Set(df, scale.span)), hn::Set(df, scale.zero)), hn::Set(df, 0.5f));
    const auto inside =
        hn::Min(hn::IfThenElseZero(hn::Ge(value, hn::Zero(df)), value), hn::Set(df, 65535.0f));
    hn::StoreU(hn::DemoteTo(halfWords, hn::ConvertTo(d32, inside)), halfWords, to);
}
HWY_INLINE VF valuesOf(const uint16_t* from, FloatScale scale) {
    if (!from) return hn::Set(df, 1.0f);
    const auto samples = hn::ConvertTo(df, hn::BitCast(d32, hn::PromoteTo(du32, hn::LoadU(halfWords, from))));
    return hn::Div(hn::Sub(samples, hn::Set(df, scale.zero)), hn::Set(df, scale.span));
}
const uint16_t* after(const uint16_t* plane, size_t i) { return plane ? plane + i : nullptr; }
#endif

void splitFloats(const Byte* from, uint16_t* const planes[4], const FloatScale scales[4], size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + hn::Lanes(df) <= n; i += hn::Lanes(df)) {
        VF value[4];
        hn::LoadInterleaved4(df, reinterpret_cast<const float*>(from + 16 * i), value[0], value[1], value[2],
                             value[3]);
        for (int k = 0; k < 4; ++k)
            if (planes[k]) putSamples(value[k], scales[k], planes[k] + i);
    }
#endif
    for (; i < n; ++i)
        for (size_t k = 0; k < 4; ++k) {
            if (!planes[k]) continue;
            const float value =
                std::bit_cast<float>(doubleAt(from, 4 * i + k)) * scales[k].span + scales[k].zero + 0.5f;
            planes[k][i] = static_cast<uint16_t>(value >= 0 ? std::min(value, 65535.0f) : 0.0f);
        }
}

void joinFloats(Byte* to, const uint16_t* const planes[4], const FloatScale scales[4], size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + hn::Lanes(df) <= n; i += hn::Lanes(df))
        hn::StoreInterleaved4(
            valuesOf(after(planes[0], i), scales[0]), valuesOf(after(planes[1], i), scales[1]),
            valuesOf(after(planes[2], i), scales[2]), valuesOf(after(planes[3], i), scales[3]), df,
            reinterpret_cast<float*>(to + 16 * i));
#endif
    for (; i < n; ++i)
        for (size_t k = 0; k < 4; ++k) {
            const float value =
                planes[k] ? (static_cast<float>(planes[k][i]) - scales[k].zero) / scales[k].span : 1.0f;
            putDouble(to, 4 * i + k, std::bit_cast<uint32_t>(value));
        }
}

const char* rows16Unit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

QV_KERNEL(splitWords4, (const Byte* from, uint16_t* a, uint16_t* b, uint16_t* c, uint16_t* d, size_t n),
          (from, a, b, c, d, n))
QV_KERNEL(joinWords4,
          (Byte * to, const uint16_t* a, const uint16_t* b, const uint16_t* c, const uint16_t* d, size_t n),
          (to, a, b, c, d, n))
QV_KERNEL(splitWords422, (const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, size_t n, bool lumaFirst),
          (from, y, u, v, n, lumaFirst))
QV_KERNEL(joinWords422,
          (Byte * to, const uint16_t* y, const uint16_t* u, const uint16_t* v, size_t n, bool lumaFirst,
           bool ten),
          (to, y, u, v, n, lumaFirst, ten))
QV_KERNEL(splitWords2, (const Byte* from, uint16_t* a, uint16_t* b, size_t n), (from, a, b, n))
QV_KERNEL(joinWords2, (Byte * to, const uint16_t* a, const uint16_t* b, size_t n, bool ten),
          (to, a, b, n, ten))
QV_KERNEL(raiseWords, (uint16_t * to, const Byte* from, size_t n, int depth), (to, from, n, depth))
QV_KERNEL(lowerWords, (Byte * to, const uint16_t* from, size_t n, int depth), (to, from, n, depth))
QV_KERNEL(roundWords, (Byte * to, const uint16_t* from, size_t n, bool ten), (to, from, n, ten))
QV_KERNEL(splitV210, (const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, size_t n), (from, y, u, v, n))
QV_KERNEL(joinV210, (Byte * to, const uint16_t* y, const uint16_t* u, const uint16_t* v, size_t n),
          (to, y, u, v, n))
QV_KERNEL(splitTens,
          (const Byte* from, uint16_t* y, uint16_t* u, uint16_t* v, uint16_t* a, size_t n, int low),
          (from, y, u, v, a, n, low))
QV_KERNEL(joinTens,
          (Byte * to, const uint16_t* y, const uint16_t* u, const uint16_t* v, const uint16_t* a, size_t n,
           int low),
          (to, y, u, v, a, n, low))
QV_KERNEL(splitFloats, (const Byte* from, uint16_t* const planes[4], const FloatScale scales[4], size_t n),
          (from, planes, scales, n))
QV_KERNEL(joinFloats, (Byte * to, const uint16_t* const planes[4], const FloatScale scales[4], size_t n),
          (to, planes, scales, n))

HWY_EXPORT(rows16Unit);
const char* rows16Unit() { return HWY_DYNAMIC_DISPATCH(rows16Unit)(); }

}  // namespace srk
#endif
