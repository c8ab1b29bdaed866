#include "builtin/kernels/scale/deep.h"

#include <algorithm>

#include "builtin/kernels/scale/scale8.h"

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/kernels/scale/deep.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

#include "builtin/kernels/lines/vectors-inl.h"

HWY_BEFORE_NAMESPACE();
namespace srk {
namespace HWY_NAMESPACE {

#if QV_VECTORS
// Whole vectors: floats are twice as wide as the samples.
const hn::ScalableTag<float> df;
using DF = decltype(hn::ScalableTag<float>());
using VF = hn::Vec<DF>;
const hn::Rebind<int32_t, DF> dInt;
const hn::Rebind<uint16_t, DF> dSample;

HWY_INLINE size_t floatLanes() { return hn::Lanes(df); }
HWY_INLINE VF loadFloats(const float* from) { return hn::LoadU(df, from); }
HWY_INLINE VF loadFloats(const uint16_t* from) {
    return hn::ConvertTo(df, hn::PromoteTo(dInt, hn::LoadU(dSample, from)));
}
// Truncated, so with a half added rounded to the nearest.
HWY_INLINE void putRounded(VF value, uint16_t* to) {
    hn::StoreU(hn::DemoteTo(dSample, hn::ConvertTo(dInt, value)), dSample, to);
}
#endif

HWY_INLINE uint16_t sampleOf(float value) {
    return static_cast<uint16_t>(std::clamp(static_cast<int>(value), 0, 65535));
}

// --- Across.

void toFloats(float* to, const uint16_t* from, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + floatLanes() <= n; i += floatLanes()) hn::StoreU(loadFloats(from + i), df, to + i);
#endif
    for (; i < n; ++i) to[i] = from[i];
}

#if QV_VECTORS
// What a block of target samples reads, by its distance from the first one.
template <class Pick>
HWY_INLINE void addTaps(const float* line, const float* weights, int taps, size_t target, float* to,
                        const Pick& pick) {
    auto sum = hn::Mul(pick(line), loadFloats(weights));
    for (int t = 1; t < taps; ++t)
        sum = hn::Add(sum, hn::Mul(pick(line + t), loadFloats(weights + static_cast<size_t>(t) * target)));
    hn::StoreU(sum, df, to);
}

HWY_INLINE void acrossBlock(const float* line, const int32_t* start, const float* weights, int taps,
                            size_t target, float* to) {
    const auto n = static_cast<int>(floatLanes());
    const int low = std::min(start[0], start[n - 1]), span = std::max(start[0], start[n - 1]) - low;
    const auto at = hn::Sub(hn::LoadU(dInt, start), hn::Set(dInt, low));
    line += low;
    if (span < n) {
        const auto indices = hn::IndicesFromVec(df, at);
        addTaps(line, weights, taps, target, to,
                [&](const float* from) HWY_ATTR { return hn::TableLookupLanes(loadFloats(from), indices); });
    } else if (span < 2 * n) {
        const auto upper = hn::RebindMask(df, hn::Gt(at, hn::Set(dInt, n - 1)));
        const auto indices = hn::IndicesFromVec(df, hn::And(at, hn::Set(dInt, n - 1)));
        addTaps(line, weights, taps, target, to, [&](const float* from) HWY_ATTR {
            return hn::IfThenElse(upper, hn::TableLookupLanes(loadFloats(from + n), indices),
                                  hn::TableLookupLanes(loadFloats(from), indices));
        });
    } else {
        addTaps(line, weights, taps, target, to,
                [&](const float* from) HWY_ATTR { return hn::GatherIndex(df, from, at); });
    }
}
#endif

void everyFourth(const DeepAcross& across, const float* line, float* to, size_t n) {
    size_t i = 0;
    const float* weights = across.weights.data();  // of the first sample, as of all
    line += across.first;
#if QV_VECTORS
    for (; i + floatLanes() <= n; i += floatLanes()) {
        VF tap[8];
        hn::LoadInterleaved4(df, line + 4 * i, tap[0], tap[1], tap[2], tap[3]);
        hn::LoadInterleaved4(df, line + 4 * i + 4, tap[4], tap[5], tap[6], tap[7]);
        auto sum = hn::Mul(tap[0], hn::Set(df, weights[0]));
        for (size_t t = 1; t < 8; ++t) sum = hn::Add(sum, hn::Mul(tap[t], hn::Set(df, weights[t * n])));
        hn::StoreU(sum, df, to + i);
    }
#endif
    for (; i < n; ++i) {
        float sum = line[4 * i] * weights[0];
        for (size_t t = 1; t < 8; ++t) sum += line[4 * i + t] * weights[t * n];
        to[i] = sum;
    }
}

void deepAcross(const Axis& axis, const DeepAcross& across, const uint16_t* from, float* padded, float* to) {
    const auto source = static_cast<size_t>(axis.source), target = static_cast<size_t>(axis.target);
    if (axis.copies) return toFloats(to, from + axis.offset, target);
    float* line = padded + beforeLine;
    std::fill(padded, line, static_cast<float>(from[0]));
    toFloats(line, from, source);
    std::fill(line + source, line + source + afterLine, static_cast<float>(from[source - 1]));
    if (across.everyFourth) return everyFourth(across, line, to, target);
    size_t i = 0;
#if QV_VECTORS
    for (; i + floatLanes() <= target; i += floatLanes())
        acrossBlock(line, axis.start.data() + i, across.weights.data() + i, axis.taps, target, to + i);
#endif
    for (; i < target; ++i) {
        const float* at = line + axis.start[i];
        float sum = at[0] * across.weights[i];
        for (int t = 1; t < axis.taps; ++t)
            sum += at[t] * across.weights[static_cast<size_t>(t) * target + i];
        to[i] = sum;
    }
}

// --- Down.

template <int fixedTaps, class T>
void downOf(const T* const* lines, const float* weights, int anyTaps, uint16_t* to, size_t n) {
    const int taps = fixedTaps ? fixedTaps : anyTaps;
    size_t i = 0;
#if QV_VECTORS
    const auto half = hn::Set(df, 0.5f);
    for (; i + 2 * floatLanes() <= n; i += 2 * floatLanes()) {
        auto low = hn::Mul(loadFloats(lines[0] + i), hn::Set(df, weights[0]));
        auto high = hn::Mul(loadFloats(lines[0] + i + floatLanes()), hn::Set(df, weights[0]));
        for (int t = 1; t < taps; ++t) {
            const auto weight = hn::Set(df, weights[t]);
            low = hn::Add(low, hn::Mul(loadFloats(lines[t] + i), weight));
            high = hn::Add(high, hn::Mul(loadFloats(lines[t] + i + floatLanes()), weight));
        }
        putRounded(hn::Add(low, half), to + i);
        putRounded(hn::Add(high, half), to + i + floatLanes());
    }
#endif
    for (; i < n; ++i) {
        float sum = static_cast<float>(lines[0][i]) * weights[0];
        for (int t = 1; t < taps; ++t) sum += static_cast<float>(lines[t][i]) * weights[t];
        to[i] = sampleOf(sum + 0.5f);
    }
}

template <class T>
HWY_INLINE void down(const T* const* lines, const float* weights, int taps, uint16_t* to, size_t n) {
    switch (taps) {
        case 1: return downOf<1>(lines, weights, taps, to, n);
        case 2: return downOf<2>(lines, weights, taps, to, n);
        case 4: return downOf<4>(lines, weights, taps, to, n);
        case 8: return downOf<8>(lines, weights, taps, to, n);
        default: return downOf<0>(lines, weights, taps, to, n);
    }
}

void downFloats(const float* const* lines, const float* weights, int taps, uint16_t* to, size_t n) {
    down(lines, weights, taps, to, n);
}
void downSamples(const uint16_t* const* lines, const float* weights, int taps, uint16_t* to, size_t n) {
    down(lines, weights, taps, to, n);
}

// --- Matrices.

struct DeepRows {
    float m[3][3], add[3];
    bool sharedLuma;  // all of Y in each row, and of chroma what B and R take
    explicit DeepRows(const Deep& deep) {
        for (int i = 0; i < 3; ++i) {
            add[i] = static_cast<float>(deep.add[i] + 0.5);
            for (int k = 0; k < 3; ++k) m[i][k] = static_cast<float>(deep.m[i][k]);
        }
        sharedLuma = m[0][0] == m[1][0] && m[1][0] == m[2][0] && m[0][2] == 0 && m[2][1] == 0;
    }
};

#if QV_VECTORS
struct DeepRow {
    VF m[3], add;
    DeepRow(const DeepRows& rows, int i)
        : m{hn::Set(df, rows.m[i][0]), hn::Set(df, rows.m[i][1]), hn::Set(df, rows.m[i][2])},
          add(hn::Set(df, rows.add[i])) {}
};
HWY_INLINE VF rowOf(const DeepRow& row, VF a, VF b, VF c) {
    return hn::Add(hn::Add(hn::Add(hn::Mul(row.m[0], a), hn::Mul(row.m[1], b)), hn::Mul(row.m[2], c)),
                   row.add);
}

// The same sums with what is 0 left out.
size_t sharedLuma(const DeepRows& rows, const uint16_t* const from[3], uint16_t* const to[3], size_t n) {
    const DeepRow r0(rows, 0), r1(rows, 1), r2(rows, 2);
    size_t i = 0;
    for (; i + floatLanes() <= n; i += floatLanes()) {
        const auto luma = hn::Mul(loadFloats(from[0] + i), r0.m[0]);
        const auto u = loadFloats(from[1] + i), v = loadFloats(from[2] + i);
        const auto green = hn::Add(hn::Add(luma, hn::Mul(r1.m[1], u)), hn::Mul(r1.m[2], v));
        putRounded(hn::Add(hn::Add(luma, hn::Mul(r0.m[1], u)), r0.add), to[0] + i);
        putRounded(hn::Add(green, r1.add), to[1] + i);
        putRounded(hn::Add(hn::Add(luma, hn::Mul(r2.m[2], v)), r2.add), to[2] + i);
    }
    return i;
}

size_t allRows(const DeepRows& rows, const uint16_t* const from[3], uint16_t* const to[3], size_t n) {
    const DeepRow r0(rows, 0), r1(rows, 1), r2(rows, 2);
    size_t i = 0;
    for (; i + floatLanes() <= n; i += floatLanes()) {
        const auto a = loadFloats(from[0] + i), b = loadFloats(from[1] + i), c = loadFloats(from[2] + i);
        putRounded(rowOf(r0, a, b, c), to[0] + i);
        if (!to[1]) continue;
        putRounded(rowOf(r1, a, b, c), to[1] + i);
        putRounded(rowOf(r2, a, b, c), to[2] + i);
    }
    return i;
}
#endif

void deepMatrix(const Deep& deep, const uint16_t* const from[3], uint16_t* const to[3], size_t n) {
    const DeepRows rows(deep);
    size_t i = 0;
#if QV_VECTORS
    i = rows.sharedLuma && to[1] ? sharedLuma(rows, from, to, n) : allRows(rows, from, to, n);
#endif
    for (; i < n; ++i) {
        const float in[3] = {static_cast<float>(from[0][i]), static_cast<float>(from[1][i]),
                             static_cast<float>(from[2][i])};
        for (int k = 0; k < (to[1] ? 3 : 1); ++k)
            to[k][i] =
                sampleOf(rows.m[k][0] * in[0] + rows.m[k][1] * in[1] + rows.m[k][2] * in[2] + rows.add[k]);
    }
}

// --- Chroma over twice or half as many pixels.

void twice(uint16_t* to, const uint16_t* from, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    for (; i + hn::Lanes(du16) <= n; i += hn::Lanes(du16)) {
        const auto x = hn::LoadU(du16, from + i);
        hn::StoreInterleaved2(x, x, du16, to + 2 * i);
    }
#endif
    for (; i < n; ++i) to[2 * i] = to[2 * i + 1] = from[i];
}

void doubleLine(uint16_t* to, const uint16_t* from, size_t n) {
    const size_t samples = n / 2;
    size_t i = 0;
#if QV_VECTORS
    for (; i + hn::Lanes(du16) + 1 <= samples; i += hn::Lanes(du16)) {
        const auto x = hn::LoadU(du16, from + i);
        hn::StoreInterleaved2(x, hn::AverageRound(x, hn::LoadU(du16, from + i + 1)), du16, to + 2 * i);
    }
#endif
    for (; i < samples; ++i) {
        to[2 * i] = from[i];
        to[2 * i + 1] = static_cast<uint16_t>((from[i] + from[std::min(i + 1, samples - 1)] + 1) >> 1);
    }
    if (n & 1) to[n - 1] = samples ? from[samples - 1] : uint16_t{32768};
}

void evens(uint16_t* to, const uint16_t* from, size_t n) {
    size_t i = 0;
#if QV_VECTORS
    const size_t step = hn::Lanes(du16);
    for (; i + step <= n; i += step)
        hn::StoreU(hn::ConcatEven(du16, hn::LoadU(du16, from + 2 * i + step), hn::LoadU(du16, from + 2 * i)),
                   du16, to + i);
#endif
    for (; i < n; ++i) to[i] = from[2 * i];
}

const char* deepUnit() { return hwy::TargetName(HWY_TARGET); }

}  // namespace HWY_NAMESPACE
}  // namespace srk
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace srk {

HWY_EXPORT(deepAcross);
HWY_EXPORT(downFloats);
HWY_EXPORT(downSamples);
HWY_EXPORT(deepMatrix);
HWY_EXPORT(twice);
HWY_EXPORT(doubleLine);
HWY_EXPORT(evens);
HWY_EXPORT(deepUnit);

void deepAcross(const Axis& axis, const DeepAcross& across, const uint16_t* from, float* padded, float* to) {
    HWY_DYNAMIC_DISPATCH(deepAcross)(axis, across, from, padded, to);
}
void deepDown(const float* const* lines, const float* weights, int taps, uint16_t* to, size_t n) {
    HWY_DYNAMIC_DISPATCH(downFloats)(lines, weights, taps, to, n);
}
void deepDown(const uint16_t* const* lines, const float* weights, int taps, uint16_t* to, size_t n) {
    HWY_DYNAMIC_DISPATCH(downSamples)(lines, weights, taps, to, n);
}
void deepMatrix(const Deep& deep, const uint16_t* const from[3], uint16_t* const to[3], size_t n) {
    HWY_DYNAMIC_DISPATCH(deepMatrix)(deep, from, to, n);
}
void twice(uint16_t* to, const uint16_t* from, size_t n) { HWY_DYNAMIC_DISPATCH(twice)(to, from, n); }
void doubleLine(uint16_t* to, const uint16_t* from, size_t n) {
    HWY_DYNAMIC_DISPATCH(doubleLine)(to, from, n);
}
void evens(uint16_t* to, const uint16_t* from, size_t n) { HWY_DYNAMIC_DISPATCH(evens)(to, from, n); }
const char* deepUnit() { return HWY_DYNAMIC_DISPATCH(deepUnit)(); }

DeepAcross makeDeepAcross(const Axis& axis) {
    DeepAcross across;
    if (axis.copies) return across;
    const auto target = static_cast<size_t>(axis.target), taps = static_cast<size_t>(axis.taps);
    across.weights.resize(target * taps);
    across.everyFourth = taps == 8;
    across.first = axis.start[0];
    for (size_t i = 0; i < target; ++i) {
        across.everyFourth = across.everyFourth && axis.start[i] == across.first + 4 * static_cast<int>(i);
        for (size_t t = 0; t < taps; ++t) {
            across.weights[t * target + i] = axis.exact[i * taps + t];
            across.everyFourth = across.everyFourth && axis.exact[i * taps + t] == axis.exact[t];
        }
    }
    return across;
}

}  // namespace srk
#endif
