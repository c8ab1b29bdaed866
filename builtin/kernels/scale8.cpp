#include "builtin/kernels/scale8.h"

#include <algorithm>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/scale8.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

constexpr int bias = 16384;

HWY_INLINE size_t count(int n) { return static_cast<size_t>(n); }

void copyAcross(const Byte* from, int16_t* to, int n) {
    int i = 0;
#if HWY_TARGET != HWY_SCALAR
    const hn::Rebind<uint8_t, decltype(hn::Repartition<int16_t, D8>())> half;
    const int step = static_cast<int>(hn::Lanes(d16));
    for (; i + step <= n; i += step)
        hn::StoreU(
            hn::Sub(hn::ShiftLeft<7>(hn::PromoteTo(d16, hn::LoadU(half, from + i))), hn::Set(d16, bias)), d16,
            to + i);
#endif
    for (; i < n; ++i) to[i] = static_cast<int16_t>(from[i] * unity - bias);
}

#if HWY_TARGET == HWY_SCALAR

// Without a byte shuffle.
void blocksAcross(const Across& across, const Byte* from, int16_t* to) {
    const int half = across.taps / 2;
    for (int i = 0; i < across.target; ++i) {
        const int b = i / 8, k = i % 8;
        const Byte* base = from + across.base[count(b)];
        const Byte* order = across.order.data() + b * 32 + 2 * k;
        const int8_t* weights = across.weights.data() + b * half * 16 + 2 * k;
        int sum = -bias;
        for (int t = 0; t < half; ++t) {
            const Byte* at = order + (t == half - 1 ? 16 : 0);
            sum += base[t + at[0]] * weights[16 * t] + base[t + at[1]] * weights[16 * t + 1];
        }
        to[i] = static_cast<int16_t>(sum);
    }
}

#else

const hn::Full128<uint8_t> block8;
const hn::Full128<int8_t> blockI8;

#if HWY_TARGET <= HWY_AVX2
constexpr int together = 2;  // blocks in a vector
HWY_INLINE V8 loadBlocks(const Byte* first, const Byte* second) {
    return hn::Combine(d8, hn::LoadU(block8, second), hn::LoadU(block8, first));
}
#else
constexpr int together = 1;
HWY_INLINE V8 loadBlocks(const Byte* first, const Byte*) { return hn::LoadU(block8, first); }
#endif

template <int half>
HWY_INLINE V16 blockSum(const Across& across, const Byte* from, int b, int next) {
    const Byte* low = from + across.base[count(b)];
    const Byte* high = from + across.base[count(next)];
    const Byte* orders = across.order.data();
    const auto* weights = reinterpret_cast<const Byte*>(across.weights.data());
    const int halves = half ? half : across.taps / 2;
    const auto pairs = loadBlocks(orders + b * 32, orders + next * 32);
    const auto centre = loadBlocks(orders + b * 32 + 16, orders + next * 32 + 16);
    auto sum = hn::Set(d16, -bias);
    for (int t = 0; t < halves; ++t) {
        const auto pixels =
            hn::TableLookupBytes(loadBlocks(low + t, high + t), t == halves - 1 ? centre : pairs);
        const auto w = loadBlocks(weights + (b * halves + t) * 16, weights + (next * halves + t) * 16);
        sum = hn::Add(sum, pairDotBytes(pixels, hn::BitCast(di8, w)));
    }
    return sum;
}

template <int half>
void blocksAcrossOf(const Across& across, const Byte* from, int16_t* to) {
    const int blocks = (across.target + 7) / 8;
    for (int b = 0; b < blocks; b += together)
        hn::StoreU(blockSum<half>(across, from, b, std::min(b + together - 1, blocks - 1)), d16, to + b * 8);
}

void blocksAcross(const Across& across, const Byte* from, int16_t* to) {
    switch (across.taps / 2) {
        case 1: return blocksAcrossOf<1>(across, from, to);
        case 2: return blocksAcrossOf<2>(across, from, to);
        case 3: return blocksAcrossOf<3>(across, from, to);
        case 4: return blocksAcrossOf<4>(across, from, to);
        default: return blocksAcrossOf<0>(across, from, to);
    }
}

#endif

void runsAcross(const Across& across, const Byte* from, int16_t* to) {
    const int room = (across.taps + 15) / 16 * 16;
    for (int i = 0; i < across.target; ++i) {
        const Byte* base = from + across.base[count(i)];
        const int8_t* weights = across.weights.data() + static_cast<std::ptrdiff_t>(i) * room;
        int sum = -bias;
        for (int t = 0; t < across.taps; ++t) sum += base[t] * weights[t];
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
        case Across::blocks: return blocksAcross(across, from, to);
        case Across::runs: return runsAcross(across, from, to);
        case Across::plain: return plainAcross(across, from, to);
    }
}

// The bias of the words, taken out again, and half of the last place.
constexpr int after = bias * unity + 8192;

#if HWY_TARGET != HWY_SCALAR
HWY_INLINE void storeDown(V32 low, V32 high, Byte* to) {
    const hn::Rebind<uint8_t, decltype(hn::Repartition<int16_t, D8>())> bytes;
    const auto words = hn::ReorderDemote2To(d16, hn::ShiftRight<14>(low), hn::ShiftRight<14>(high));
    hn::StoreU(hn::DemoteTo(bytes, words), bytes, to);
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
#if HWY_TARGET != HWY_SCALAR
    const int step = static_cast<int>(hn::Lanes(d16));
    V16 w[fixedTaps ? fixedTaps / 2 : 1];
    if (fixedTaps)
        for (int t = 0; t < taps; t += 2) w[t / 2] = pairOf(weights[t], weights[t + 1]);
    for (; x + step <= n; x += step) {
        auto low = hn::Set(d32, after), high = low;
        for (int t = 0; t < taps; t += 2) {
            const auto pair = fixedTaps ? w[fixedTaps ? t / 2 : 0] : pairOf(weights[t], weights[t + 1]);
            const auto a = hn::LoadU(d16, lines[t] + x), b = hn::LoadU(d16, lines[t + 1] + x);
            low = hn::Add(low, pairDot(hn::InterleaveLower(d16, a, b), pair));
            high = hn::Add(high, pairDot(hn::InterleaveUpper(d16, a, b), pair));
        }
        storeDown(low, high, to + x);
    }
#endif
    for (; x < n; ++x) to[x] = downOne(lines, weights, taps, x);
}

void downCopy(const int16_t* line, Byte* to, int n) {
    int x = 0;
#if HWY_TARGET != HWY_SCALAR
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
HWY_EXPORT(scale8Unit);

void scaleAcross(const Across& across, const Byte* from, int16_t* to) {
    HWY_DYNAMIC_DISPATCH(scaleAcross)(across, from, to);
}

void scaleDown(const int16_t* const* lines, const int16_t* weights, int taps, Byte* to, int n) {
    HWY_DYNAMIC_DISPATCH(scaleDown)(lines, weights, taps, to, n);
}

const char* scale8Unit() { return HWY_DYNAMIC_DISPATCH(scale8Unit)(); }

}  // namespace srk
#endif
