#include "builtin/kernels/scale/scale8.h"

#include <algorithm>
#include <cstring>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/scale/scale8.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/lines/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

constexpr int bias = 16384;

HWY_INLINE size_t count(int n) { return static_cast<size_t>(n); }

void copyAcross(const Byte* from, int16_t* to, int n) {
    int i = 0;
#if QV_VECTORS
    const hn::Rebind<uint8_t, decltype(hn::Repartition<int16_t, D8>())> half;
    const int step = static_cast<int>(hn::Lanes(d16));
    for (; i + step <= n; i += step)
        hn::StoreU(
            hn::Sub(hn::ShiftLeft<7>(hn::PromoteTo(d16, hn::LoadU(half, from + i))), hn::Set(d16, bias)), d16,
            to + i);
#endif
    for (; i < n; ++i) to[i] = static_cast<int16_t>(from[i] * unity - bias);
}

// (32 a + 64 b + 32 c) for the samples around each second one.
void halvesAcross(const Byte* from, int16_t* to, int n) {
    int i = 0;
#if QV_VECTORS
    const int step = static_cast<int>(hn::Lanes(d16));
    const auto low = hn::Set(du16, 255);
    for (; i + step <= n; i += step) {
        const auto at = hn::BitCast(du16, hn::LoadU(d8, from + 2 * i));
        const auto before = hn::BitCast(du16, hn::LoadU(d8, from + 2 * i - 2));
        const auto around = hn::Add(hn::ShiftRight<8>(at), hn::ShiftRight<8>(before));
        const auto sum = hn::ShiftLeft<5>(hn::Add(around, hn::ShiftLeft<1>(hn::And(at, low))));
        hn::StoreU(hn::Sub(hn::BitCast(d16, sum), hn::Set(d16, bias)), d16, to + i);
    }
#endif
    for (; i < n; ++i) {
        const Byte* at = from + 2 * i;
        to[i] = static_cast<int16_t>(32 * (at[-1] + 2 * at[0] + at[1]) - bias);
    }
}

void quartersAcross(const Across& across, const Byte* from, int16_t* to) {
    const int8_t* weights = across.weights.data();
    const int n = across.target;
    int i = 0;
    from += across.base[0];
#if QV_VECTORS
    const int step = static_cast<int>(hn::Lanes(d8));
    for (; i + step <= n; i += step) {
        V8 near[4], far[4];
        hn::LoadInterleaved4(d8, from + 4 * i, near[0], near[1], near[2], near[3]);
        hn::LoadInterleaved4(d8, from + 4 * i + 4, far[0], far[1], far[2], far[3]);
        auto low = hn::Set(d16, -bias), high = low;
        for (int t = 0; t < 4; ++t) {
            const int both = static_cast<Byte>(weights[t]) | static_cast<Byte>(weights[t + 4]) << 8;
            const auto pair = hn::BitCast(di8, hn::Set(du16, static_cast<uint16_t>(both)));
            low = hn::Add(low, pairDotBytes(hn::InterleaveLower(d8, near[t], far[t]), pair));
            high = hn::Add(high, pairDotBytes(hn::InterleaveUpper(d8, near[t], far[t]), pair));
        }
#if HWY_TARGET <= HWY_AVX2
        hn::StoreU(hn::ConcatLowerLower(d16, high, low), d16, to + i);
        hn::StoreU(hn::ConcatUpperUpper(d16, high, low), d16, to + i + step / 2);
#else
        hn::StoreU(low, d16, to + i);
        hn::StoreU(high, d16, to + i + step / 2);
#endif
    }
#endif
    for (; i < n; ++i) {
        int sum = -bias;
        for (int t = 0; t < 8; ++t) sum += from[4 * i + t] * weights[t];
        to[i] = static_cast<int16_t>(sum);
    }
}

#if !QV_VECTORS

// The tables are made for vectors that pick bytes.
template <int windows>
void blocksAcross(const Across& across, const Byte* from, int16_t* to) {
    const int half = across.taps / 2;
    for (int i = 0; i < across.target; ++i) {
        const int b = i / 8, k = b % 2 * 16 + i % 8 * 2;
        const Byte* base = from + across.base[count(b)];
        const Byte* orders = across.order.data() + b / 2 * windows * 64 + k;
        const int8_t* weights = across.weights.data() + b / 2 * half * 32 + k;
        int sum = -bias;
        for (int t = 0; t < half; ++t)
            for (int side = 0; side < 2; ++side) {
                const Byte* order = orders + (t == half - 1 ? windows * 32 : 0) + side;
                const int at = order[0] != 0x80 ? order[0] : 16 + order[32 * (windows - 1)];
                sum += base[t + at] * weights[32 * t + side];
            }
        to[i] = static_cast<int16_t>(sum);
    }
}

#else

const hn::Full128<uint8_t> block8;

#if HWY_TARGET <= HWY_AVX2
constexpr int together = 2;  // blocks in a vector
HWY_INLINE V8 loadBlocks(const Byte* first, const Byte* second) {
    return hn::Combine(d8, hn::LoadU(block8, second), hn::LoadU(block8, first));
}
#else
constexpr int together = 1;
HWY_INLINE V8 loadBlocks(const Byte* first, const Byte*) { return hn::LoadU(block8, first); }
#endif

// `half`: pairs of taps, or 0 for any number.
template <int windows, int half>
void blocksAcrossOf(const Across& across, const Byte* from, int16_t* to) {
    const int halves = half ? half : across.taps / 2;
    const auto blocks = static_cast<int>(across.base.size());
    for (int b = 0; b < blocks; b += together) {
        const Byte* low = from + across.base[count(b)];
        const Byte* high = from + across.base[count(b + together - 1)];
        const Byte* orders = across.order.data() + b / 2 * windows * 64 + b % 2 * 16;
        const auto* weights =
            reinterpret_cast<const Byte*>(across.weights.data()) + b / 2 * halves * 32 + b % 2 * 16;
        auto sum = hn::Set(d16, -bias);
        for (int t = 0; t < halves; ++t) {
            const Byte* order = orders + (t == halves - 1 ? windows * 32 : 0);
            auto pixels = hn::TableLookupBytesOr0(loadBlocks(low + t, high + t), hn::LoadU(d8, order));
            if (windows == 2)
                pixels = hn::Or(pixels, hn::TableLookupBytesOr0(loadBlocks(low + t + 16, high + t + 16),
                                                                hn::LoadU(d8, order + 32)));
            sum = hn::Add(sum, pairDotBytes(pixels, hn::BitCast(di8, hn::LoadU(d8, weights + 32 * t))));
        }
        hn::StoreU(sum, d16, to + b * 8);
    }
}

template <int windows>
void blocksAcross(const Across& across, const Byte* from, int16_t* to) {
    switch (across.taps / 2) {
        case 1: return blocksAcrossOf<windows, 1>(across, from, to);
        case 2: return blocksAcrossOf<windows, 2>(across, from, to);
        case 3: return blocksAcrossOf<windows, 3>(across, from, to);
        case 4: return blocksAcrossOf<windows, 4>(across, from, to);
        default: return blocksAcrossOf<windows, 0>(across, from, to);
    }
}

#endif

void runsAcross(const Across& across, const Byte* from, int16_t* to) {
    const int8_t* weights = across.weights.data();
    for (int i = 0; i < across.target; ++i, weights += across.taps) {
        const Byte* base = from + across.base[count(i)];
        int sum = -bias, t = 0;
#if QV_VECTORS
        const auto half = static_cast<int>(hn::Lanes(d8)), all = across.taps / half * half;
        if (all) {
            auto sums = hn::Zero(d32);
            for (; t < all; t += half) {
                const auto products = pairDotBytes(hn::LoadU(d8, base + t), hn::LoadU(di8, weights + t));
                sums = hn::Add(sums, pairDot(products, hn::Set(d16, 1)));
            }
            sum += hn::GetLane(hn::SumOfLanes(d32, sums));
        }
#endif
        for (; t < across.taps; ++t) sum += base[t] * weights[t];
        to[i] = static_cast<int16_t>(sum);
    }
}

void plainAcross(const Across& across, const Byte* from, int16_t* to) {
    const int16_t* weights = across.words.data();
    for (int i = 0; i < across.target; ++i, weights += across.taps) {
        const Byte* base = from + across.base[count(i)];
        int sum = -bias;
        for (int t = 0; t < across.taps; ++t) sum += base[t] * weights[t];
        to[i] = static_cast<int16_t>(sum);
    }
}

void scaleAcross(const Across& across, const Byte* from, int16_t* to) {
    switch (across.form) {
        case Across::copy: return copyAcross(from + across.offset, to, across.target);
        case Across::halves: return halvesAcross(from, to, across.target);
        case Across::quarters: return quartersAcross(across, from, to);
        case Across::blocks: return blocksAcross<1>(across, from, to);
        case Across::wide: return blocksAcross<2>(across, from, to);
        case Across::runs: return runsAcross(across, from, to);
        case Across::plain: return plainAcross(across, from, to);
    }
}

// The bias of the words, taken out again, and half of the last place.
constexpr int after = bias * unity + 8192;

#if QV_VECTORS
// Whole vectors: lines need no order across blocks.
const hn::ScalableTag<int16_t> w16;
using W16 = decltype(hn::ScalableTag<int16_t>());
const hn::RepartitionToWide<W16> w32;
using Wide16 = hn::Vec<W16>;
using Wide32 = hn::Vec<decltype(hn::RepartitionToWide<W16>())>;

HWY_INLINE Wide32 wideDot(Wide16 a, Wide16 b) {
#if HWY_ARCH_X86
    auto unused = hn::Zero(w32);
    return hn::ReorderWidenMulAccumulate(w32, a, b, hn::Zero(w32), unused);
#else
    return pairDot(a, b);
#endif
}

HWY_INLINE void storeDown(Wide32 low, Wide32 high, Byte* to) {
    const hn::Rebind<uint8_t, W16> bytes;
    const auto words = hn::ReorderDemote2To(w16, hn::ShiftRight<14>(low), hn::ShiftRight<14>(high));
    hn::StoreU(hn::DemoteTo(bytes, words), bytes, to);
}

HWY_INLINE Wide16 widePair(int first, int second) {
    const auto packed = static_cast<uint32_t>(static_cast<uint16_t>(first)) | static_cast<uint32_t>(second)
                                                                                  << 16;
    return hn::BitCast(w16, hn::Set(w32, static_cast<int32_t>(packed)));
}
#endif

HWY_INLINE Byte downOne(const int16_t* const* lines, const int16_t* weights, int taps, int x) {
    int sum = after;
    for (int t = 0; t < taps; ++t) sum += lines[t][x] * weights[t];
    return static_cast<Byte>(std::clamp(sum >> 14, 0, 255));
}

template <int fixedTaps>
void downOf(const int16_t* const* lines, const int16_t* weights, int anyTaps, Byte* to, int n) {
    const int taps = fixedTaps ? fixedTaps : anyTaps;
    int x = 0;
#if QV_VECTORS
    const int step = static_cast<int>(hn::Lanes(w16));
    for (; x + step <= n; x += step) {
        auto low = hn::Set(w32, after), high = low;
        for (int t = 0; t < taps; t += 2) {
            const auto pair = widePair(weights[t], weights[t + 1]);
            const auto a = hn::LoadU(w16, lines[t] + x), b = hn::LoadU(w16, lines[t + 1] + x);
            low = hn::Add(low, wideDot(hn::InterleaveLower(w16, a, b), pair));
            high = hn::Add(high, wideDot(hn::InterleaveUpper(w16, a, b), pair));
        }
        storeDown(low, high, to + x);
    }
#endif
    for (; x < n; ++x) to[x] = downOne(lines, weights, taps, x);
}

template <int fixedTaps>
void downBytesOf(const Byte* const* lines, const int8_t* weights, int anyTaps, Byte* to, int n) {
    const int half = (fixedTaps ? fixedTaps : anyTaps) / 2;
    int x = 0;
#if QV_VECTORS
    const int step = static_cast<int>(hn::Lanes(d8));
    // Sums less 128 are signed bytes: one more than that is clamped as it should be.
    const auto start = hn::Set(d16, 64 - bias);
    const auto centre = hn::Set(d16, 128);
    for (; x + step <= n; x += step) {
        auto low = start, high = start;
        for (int t = 0; t < half; ++t) {
            uint16_t both;
            std::memcpy(&both, weights + 2 * t, 2);
            const auto pair = hn::BitCast(di8, hn::Set(du16, both));
            const auto a = hn::LoadU(d8, lines[t] + x), b = hn::LoadU(d8, lines[t + half] + x);
            low = hn::Add(low, pairDotBytes(hn::InterleaveLower(d8, a, b), pair));
            high = hn::Add(high, pairDotBytes(hn::InterleaveUpper(d8, a, b), pair));
        }
        hn::StoreU(
            joinWords(hn::Add(hn::ShiftRight<7>(low), centre), hn::Add(hn::ShiftRight<7>(high), centre)), d8,
            to + x);
    }
#endif
    for (; x < n; ++x) {
        int sum = 64;
        for (int t = 0; t < half; ++t)
            sum += lines[t][x] * weights[2 * t] + lines[t + half][x] * weights[2 * t + 1];
        to[x] = static_cast<Byte>(std::clamp(sum >> 7, 0, 255));
    }
}

void scaleDownBytes(const Byte* const* lines, const int8_t* weights, int taps, Byte* to, int n) {
    switch (taps) {
        case 2: return downBytesOf<2>(lines, weights, taps, to, n);
        case 4: return downBytesOf<4>(lines, weights, taps, to, n);
        case 8: return downBytesOf<8>(lines, weights, taps, to, n);
        default: return downBytesOf<0>(lines, weights, taps, to, n);
    }
}

void downCopy(const int16_t* line, Byte* to, int n) {
    int x = 0;
#if QV_VECTORS
    const hn::Rebind<uint8_t, decltype(hn::Repartition<int16_t, D8>())> bytes;
    const int step = static_cast<int>(hn::Lanes(d16));
    // (word + 16384 + 64) >> 7 without leaving 16 bits: 128 is put back after the shift.
    for (; x + step <= n; x += step) {
        const auto word = hn::SaturatedAdd(hn::LoadU(d16, line + x), hn::Set(d16, 64));
        hn::StoreU(hn::DemoteTo(bytes, hn::Add(hn::ShiftRight<7>(word), hn::Set(d16, 128))), bytes, to + x);
    }
#endif
    for (; x < n; ++x) to[x] = static_cast<Byte>(std::clamp((line[x] + bias + 64) >> 7, 0, 255));
}

void scaleDown(const int16_t* const* lines, const int16_t* weights, int taps, Byte* to, int n) {
    switch (taps) {
        case 1: return downCopy(lines[0], to, n);
        case 2: return downOf<2>(lines, weights, taps, to, n);
        case 4: return downOf<4>(lines, weights, taps, to, n);
        case 6: return downOf<6>(lines, weights, taps, to, n);
        case 8: return downOf<8>(lines, weights, taps, to, n);
        default: return downOf<0>(lines, weights, taps, to, n);
    }
}

const char* scale8Unit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

HWY_EXPORT(scaleAcross);
HWY_EXPORT(scaleDown);
HWY_EXPORT(scaleDownBytes);
HWY_EXPORT(scale8Unit);

void scaleAcross(const Across& across, const Byte* from, int16_t* to) {
    HWY_DYNAMIC_DISPATCH(scaleAcross)(across, from, to);
}

void scaleDown(const int16_t* const* lines, const int16_t* weights, int taps, Byte* to, int n) {
    HWY_DYNAMIC_DISPATCH(scaleDown)(lines, weights, taps, to, n);
}

void scaleDownBytes(const Byte* const* lines, const int8_t* weights, int taps, Byte* to, int n) {
    HWY_DYNAMIC_DISPATCH(scaleDownBytes)(lines, weights, taps, to, n);
}

const char* scale8Unit() { return HWY_DYNAMIC_DISPATCH(scale8Unit)(); }

}  // namespace srk
#endif
