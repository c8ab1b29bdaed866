#include "builtin/kernels/rgbhalves.h"

#include <algorithm>

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/rgbhalves.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/vectors-inl.h"

// Elsewhere the plain loops do the work: these count on how this unit packs and multiplies.
#undef QV_HALVES
#define QV_HALVES (QV_VECTORS && HWY_ARCH_X86)

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

#if QV_HALVES
// Whole vectors: there is enough to do for each byte.
const hn::ScalableTag<uint8_t> hBytes;
using HB = decltype(hn::ScalableTag<uint8_t>());
const hn::RepartitionToWide<HB> huWords;
const hn::Repartition<int16_t, HB> hWords;
const hn::Repartition<int32_t, HB> hInts;
using HV8 = hn::Vec<HB>;
using HV16 = hn::Vec<decltype(hn::Repartition<int16_t, HB>())>;
using HV32 = hn::Vec<decltype(hn::Repartition<int32_t, HB>())>;

HWY_INLINE size_t byteLanes() { return hn::Lanes(hBytes); }

HWY_INLINE HV32 dot(HV16 a, HV16 b) {
    auto unused = hn::Zero(hInts);
    return hn::ReorderWidenMulAccumulate(hInts, a, b, hn::Zero(hInts), unused);
}

HWY_INLINE HV16 dotBytes(HV8 pixels, HV8 weights) {
#if HWY_TARGET <= HWY_AVX3
    return HV16{_mm512_maddubs_epi16(pixels.raw, weights.raw)};
#elif HWY_TARGET <= HWY_AVX2
    return HV16{_mm256_maddubs_epi16(pixels.raw, weights.raw)};
#else
    return HV16{_mm_maddubs_epi16(pixels.raw, weights.raw)};
#endif
}

HWY_INLINE HV8 clampBytes(HV16 low, HV16 high) {
#if HWY_TARGET <= HWY_AVX3
    return HV8{_mm512_packus_epi16(low.raw, high.raw)};
#elif HWY_TARGET <= HWY_AVX2
    return HV8{_mm256_packus_epi16(low.raw, high.raw)};
#else
    return HV8{_mm_packus_epi16(low.raw, high.raw)};
#endif
}

HWY_INLINE HV16 pairWeights(int first, int second) {
    const auto packed = static_cast<uint32_t>(static_cast<uint16_t>(first)) | static_cast<uint32_t>(second)
                                                                                  << 16;
    return hn::BitCast(hWords, hn::Set(hInts, static_cast<int32_t>(packed)));
}

// Four vectors of 32-bit lanes to bytes in their order: packing goes block by block, so double word d of the
// result lies in block d % blocks at place d / blocks.
class Packer {
  public:
    Packer() : order_(hn::SetTableIndices(hInts, places())) {}
    HWY_INLINE HV8 operator()(const HV32 v[4]) const {
        const auto bytes =
            clampBytes(hn::ReorderDemote2To(hWords, v[0], v[1]), hn::ReorderDemote2To(hWords, v[2], v[3]));
        return hn::BitCast(hBytes, hn::TableLookupLanes(hn::BitCast(hInts, bytes), order_));
    }

  private:
    static const int32_t* places() {
        static const struct Table {
            int32_t at[16];
            Table() {
                const auto blocks = static_cast<int>(byteLanes() / 16);
                for (int d = 0; d < 4 * blocks; ++d) at[d] = d % blocks * 4 + d / blocks;
            }
        } table;
        return table.at;
    }
    decltype(hn::SetTableIndices(hInts, static_cast<const int32_t*>(nullptr))) order_;
};
#endif

HWY_INLINE Byte toByte(int value) { return static_cast<Byte>(std::clamp(value, 0, 255)); }

void rgb4ToLuma(const ToYuv& rows, const Byte* from, Byte* y, size_t n) {
    size_t i = 0;
#if QV_HALVES
    const auto blueRed = pairWeights(rows.y[0], rows.y[2]), green = pairWeights(rows.y[1], 0);
    const auto add = hn::Set(hInts, rows.yAdd);
    const auto low = hn::Set(hWords, 255);
    const Packer pack;
    for (; i + byteLanes() <= n; i += byteLanes()) {
        HV32 sums[4];
        for (size_t k = 0; k < 4; ++k) {
            const auto pixels = hn::LoadU(hBytes, from + 4 * i + k * byteLanes());
            const auto odd = hn::BitCast(hWords, hn::ShiftRight<8>(hn::BitCast(huWords, pixels)));
            const auto sum =
                hn::Add(dot(hn::And(hn::BitCast(hWords, pixels), low), blueRed), dot(odd, green));
            sums[k] = hn::ShiftRight<15>(hn::Add(sum, add));
        }
        hn::StoreU(pack(sums), hBytes, y + i);
    }
#endif
    for (; i < n; ++i) {
        const Byte* p = from + 4 * i;
        y[i] = toByte((rows.y[0] * p[0] + rows.y[1] * p[1] + rows.y[2] * p[2] + rows.yAdd) >> 15);
    }
}

void rgb4Halves(const Byte* from, int16_t* half, size_t n, bool filtered) {
    const size_t samples = n / 2;
    const auto one = [&](size_t i) {
        const Byte* at = from + 8 * i;
        const Byte* before = filtered && i > 0 ? at - 4 : at;
        const Byte* behind = filtered ? at + 4 : at;
        for (int c = 0; c < 4; ++c)
            half[4 * i + static_cast<size_t>(c)] = static_cast<int16_t>(before[c] + 2 * at[c] + behind[c]);
    };
    size_t i = 0;
    if (samples > 0) one(i++);
#if QV_HALVES
    alignas(16) static constexpr Byte pairs[16] = {0, 4, 1, 5, 2, 6, 3, 7, 8, 12, 9, 13, 10, 14, 11, 15};
    const auto order = hn::LoadDup128(hBytes, pairs);
    const size_t step = byteLanes() / 8;
    const auto weights = hn::BitCast(hBytes, hn::Set(hWords, filtered ? 1 | 1 << 8 : 4));
    for (; i + step <= samples; i += step) {
        const auto at = hn::TableLookupBytes(hn::LoadU(hBytes, from + 8 * i), order);
        auto sum = dotBytes(at, weights);
        if (filtered) {
            const auto before = hn::TableLookupBytes(hn::LoadU(hBytes, from + 8 * i - 4), order);
            sum = hn::Add(sum, dotBytes(before, weights));
        }
        hn::StoreU(sum, hWords, half + 4 * i);
    }
#endif
    for (; i < samples; ++i) one(i);
}

// Of the words: 4 for the pass across, 16 for the one down.
constexpr int chromaShift = 15 + 6;

#if QV_HALVES
// Sums down: at most 16320.
HWY_INLINE HV16 weighed(const int16_t* const* lines, const HV16* weights, int taps, size_t at) {
    auto sum = hn::Mul(hn::LoadU(hWords, lines[0] + at), weights[0]);
    for (int t = 1; t < taps; ++t) sum = hn::Add(sum, hn::Mul(hn::LoadU(hWords, lines[t] + at), weights[t]));
    return sum;
}

HWY_INLINE HV16 symmetric(const int16_t* const* lines, const HV16* weights, size_t at) {
    const auto outer = hn::Add(hn::LoadU(hWords, lines[0] + at), hn::LoadU(hWords, lines[3] + at));
    const auto inner = hn::Add(hn::LoadU(hWords, lines[1] + at), hn::LoadU(hWords, lines[2] + at));
    return hn::Add(hn::Mul(outer, weights[0]), hn::Mul(inner, weights[1]));
}

constexpr int mostTaps = 4;

template <class Sum>
HWY_INLINE size_t eachChroma(const ToYuv& rows, Byte* u, Byte* v, size_t n, const Sum& sumAt) {
    const auto blueGreenU = pairWeights(rows.u[0], rows.u[1]), blueGreenV = pairWeights(rows.v[0], rows.v[1]);
    const auto redU = pairWeights(rows.u[2], 0), redV = pairWeights(rows.v[2], 0);
    const auto rowU =
        hn::BitCast(hWords, hn::OddEven(hn::BitCast(hInts, redU), hn::BitCast(hInts, blueGreenU)));
    const auto rowV =
        hn::BitCast(hWords, hn::OddEven(hn::BitCast(hInts, redV), hn::BitCast(hInts, blueGreenV)));
    const auto add = hn::Set(hInts, rows.chromaAdd << 6);
    const auto low = hn::Set(huWords, 255);
    const hn::Rebind<uint8_t, decltype(hn::Repartition<int16_t, HB>())> narrow;
    const Packer pack;
    size_t i = 0;
    for (; i + byteLanes() / 2 <= n; i += byteLanes() / 2) {
        HV32 both[4];
        for (size_t k = 0; k < 4; ++k) {
            const auto sum = sumAt(4 * i + k * byteLanes() / 2);
            const auto su = dot(sum, rowU), sv = dot(sum, rowV);
            // Blue and green of U beside red of V, and the other way round: added up, U beside V.
            const auto added = hn::Add(hn::OddEven(sv, su), hn::Shuffle2301(hn::OddEven(su, sv)));
            both[k] = hn::ShiftRight<chromaShift>(hn::Add(added, add));
        }
        const auto pairs = hn::BitCast(huWords, pack(both));
        hn::StoreU(hn::DemoteTo(narrow, hn::BitCast(hWords, hn::And(pairs, low))), narrow, u + i);
        hn::StoreU(hn::DemoteTo(narrow, hn::BitCast(hWords, hn::ShiftRight<8>(pairs))), narrow, v + i);
    }
    return i;
}
#endif

void halvesToChroma(const ToYuv& rows, const int16_t* const* lines, const int* weights, int taps, Byte* u,
                    Byte* v, size_t n) {
    size_t i = 0;
#if QV_HALVES
    if (taps <= mostTaps) {
        HV16 factors[mostTaps];
        for (int t = 0; t < taps; ++t) factors[t] = hn::Set(hWords, static_cast<int16_t>(weights[t]));
        if (taps == 4 && weights[0] == weights[3] && weights[1] == weights[2])
            i = eachChroma(rows, u, v, n, [&](size_t at) HWY_ATTR { return symmetric(lines, factors, at); });
        else
            i = eachChroma(rows, u, v, n,
                           [&](size_t at) HWY_ATTR { return weighed(lines, factors, taps, at); });
    }
#endif
    for (; i < n; ++i) {
        int bgr[3] = {};
        for (int t = 0; t < taps; ++t)
            for (size_t c = 0; c < 3; ++c) bgr[c] += lines[t][4 * i + c] * weights[t];
        const int add = rows.chromaAdd << 6;
        u[i] = toByte((rows.u[0] * bgr[0] + rows.u[1] * bgr[1] + rows.u[2] * bgr[2] + add) >> chromaShift);
        v[i] = toByte((rows.v[0] * bgr[0] + rows.v[1] * bgr[1] + rows.v[2] * bgr[2] + add) >> chromaShift);
    }
}

const char* rgbHalvesUnit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

HWY_EXPORT(rgb4ToLuma);
HWY_EXPORT(rgb4Halves);
HWY_EXPORT(halvesToChroma);
HWY_EXPORT(rgbHalvesUnit);

void rgb4ToLuma(const ToYuv& rows, const Byte* from, Byte* y, size_t n) {
    HWY_DYNAMIC_DISPATCH(rgb4ToLuma)(rows, from, y, n);
}
void rgb4Halves(const Byte* from, int16_t* half, size_t n, bool filtered) {
    HWY_DYNAMIC_DISPATCH(rgb4Halves)(from, half, n, filtered);
}
void halvesToChroma(const ToYuv& rows, const int16_t* const* lines, const int* weights, int taps, Byte* u,
                    Byte* v, size_t n) {
    HWY_DYNAMIC_DISPATCH(halvesToChroma)(rows, lines, weights, taps, u, v, n);
}
const char* rgbHalvesUnit() { return HWY_DYNAMIC_DISPATCH(rgbHalvesUnit)(); }

}  // namespace srk
#endif
