#include "builtin/sound/format/resamplerows.h"

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/sound/format/resamplerows.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

HWY_BEFORE_NAMESPACE();
namespace snd {
namespace HWY_NAMESPACE {
constexpr int tapCount = Resampler::taps;

// Samples, taps, and the taps twice each.
using In = const double*;

// Calls put(out, first sample, taps, doubled taps) for each output sample inside the run.
template <class Put>
HWY_INLINE int walkRun(const RateRun& run, const RateTaps& taps, RateWalk& walk, int32_t* HWY_RESTRICT out,
                       int n, Put put) {
    RateWalk latest = walk;
    int done = 0;
    for (; done < n; ++done) {
        RateWalk next = latest;
        next.advance();
        if (next.index < run.begin || next.index >= run.end) break;
        latest = next;
        const int place = next.phase * tapCount;
        put(out, run.in + (next.index - Resampler::leftReach) * run.inChannels, taps.table + place,
            taps.doubled + 2 * place);
        out += run.outChannels;
    }
    walk = latest;
    return done;
}

#if HWY_TARGET == HWY_SCALAR || HWY_TARGET == HWY_EMU128

HWY_INLINE double sumOf(In in, int channels, In taps) {
    double sum = 0;
    for (int k = 0; k < tapCount; ++k) sum += taps[k] * in[k * channels];
    return sum;
}

HWY_INLINE void one(int32_t* out, In in, In taps) { out[0] = rounded<14>(sumOf(in, 1, taps)); }

HWY_INLINE void two(int32_t* out, In in, In taps) {
    out[0] = rounded<14>(sumOf(in, 2, taps));
    out[1] = rounded<14>(sumOf(in + 1, 2, taps));
}

HWY_INLINE void mixed(int32_t* out, In in, In taps) {
    out[0] = rounded<15>(sumOf(in, 2, taps) + sumOf(in + 1, 2, taps));
}

HWY_INLINE void many(int32_t* out, In in, int channels, In taps) {
    for (int c = 0; c < channels; ++c) out[c] = rounded<14>(sumOf(in + c, channels, taps));
}

#else

namespace hn = hwy::HWY_NAMESPACE;

const hn::CappedTag<double, 4> d;
const hn::FixedTag<double, 2> d2;
using D = hn::CappedTag<double, 4>;
using V = hn::Vec<D>;
constexpr int lanes = hn::MaxLanes(D());

// The products of values and taps that lie in the same order, added up in each lane.
template <int count>
HWY_INLINE V products(In in, In taps) {
    V even = hn::Zero(d), odd = even;
    for (int k = 0; k < count; k += 2 * lanes) {
        even = hn::MulAdd(hn::LoadU(d, in + k), hn::LoadU(d, taps + k), even);
        odd = hn::MulAdd(hn::LoadU(d, in + k + lanes), hn::LoadU(d, taps + k + lanes), odd);
    }
    return hn::Add(even, odd);
}

// The lanes of even and those of odd places added up.
HWY_INLINE hn::Vec<decltype(d2)> toTwo(V sums) {
#if HWY_TARGET <= HWY_AVX2
    return hn::Add(hn::LowerHalf(d2, sums), hn::UpperHalf(d2, sums));
#else
    return sums;
#endif
}

// As rounded(), lane by lane.
template <int shift, class Tag>
HWY_INLINE auto roundedLanes(Tag tag, hn::Vec<Tag> sums) {
    constexpr double unit = 1 << shift;
    const auto moved = hn::Add(sums, hn::Set(tag, unit / 2 - 1));
    const auto whole = hn::Floor(hn::Mul(moved, hn::Set(tag, 1 / unit)));
    const auto bounded = hn::Min(hn::Max(whole, hn::Set(tag, INT32_MIN)), hn::Set(tag, INT32_MAX));
    return hn::DemoteTo(hn::Rebind<int32_t, Tag>(), bounded);
}

HWY_INLINE void two(int32_t* out, In in, In doubled) {
    const auto sums = toTwo(products<2 * tapCount>(in, doubled));
    hn::StoreU(roundedLanes<14>(d2, sums), hn::Rebind<int32_t, decltype(d2)>(), out);
}

HWY_INLINE void mixed(int32_t* out, In in, In doubled) {
    const auto sums = toTwo(products<2 * tapCount>(in, doubled));
    out[0] = hn::GetLane(roundedLanes<15>(d2, hn::SumOfLanes(d2, sums)));
}

HWY_INLINE void one(int32_t* out, In in, In taps) {
    const auto sums = toTwo(products<tapCount>(in, taps));
    out[0] = hn::GetLane(roundedLanes<14>(d2, hn::SumOfLanes(d2, sums)));
}

// As many channels at a time as there are lanes. The last ones read into what follows.
HWY_INLINE void many(int32_t* out, In in, int channels, In taps) {
    for (int c = 0; c < channels; c += lanes) {
        V even = hn::Zero(d), odd = even;
        for (int k = 0; k < tapCount; k += 2) {
            even = hn::MulAdd(hn::LoadU(d, in + k * channels + c), hn::Set(d, taps[k]), even);
            odd = hn::MulAdd(hn::LoadU(d, in + (k + 1) * channels + c), hn::Set(d, taps[k + 1]), odd);
        }
        HWY_ALIGN int32_t values[lanes];
        hn::Store(roundedLanes<14>(d, hn::Add(even, odd)), hn::Rebind<int32_t, D>(), values);
        for (int k = 0; k < std::min(lanes, channels - c); ++k) out[c + k] = values[k];
    }
}

#endif

int makeInside(const RateRun& run, const RateTaps& taps, RateWalk& walk, int32_t* out, int n) {
    const auto walked = [&](auto put) HWY_ATTR { return walkRun(run, taps, walk, out, n, put); };
    constexpr bool plain = HWY_TARGET == HWY_SCALAR || HWY_TARGET == HWY_EMU128;
    const auto order = [](In table, In doubled) HWY_ATTR { return plain ? table : doubled; };
    if (run.inChannels == 1 && run.outChannels == 1)
        return walked([](int32_t* to, In in, In table, In) HWY_ATTR { one(to, in, table); });
    if (run.inChannels == 1)
        return walked([](int32_t* to, In in, In table, In) HWY_ATTR {
            one(to, in, table);
            to[1] = to[0];
        });
    if (run.inChannels == 2 && run.outChannels == 1)
        return walked([=](int32_t* to, In in, In table, In doubled)
                          HWY_ATTR { mixed(to, in, order(table, doubled)); });
    if (run.inChannels == 2)
        return walked([=](int32_t* to, In in, In table, In doubled)
                          HWY_ATTR { two(to, in, order(table, doubled)); });
    return walked([&](int32_t* to, In in, In table, In) HWY_ATTR { many(to, in, run.inChannels, table); });
}

}  // namespace HWY_NAMESPACE
}  // namespace snd
HWY_AFTER_NAMESPACE();

#if HWY_ONCE
namespace snd {

HWY_EXPORT(makeInside);
int makeInside(const RateRun& run, const RateTaps& taps, RateWalk& walk, int32_t* out, int n) {
    return HWY_DYNAMIC_DISPATCH(makeInside)(run, taps, walk, out, n);
}

}  // namespace snd
#endif
