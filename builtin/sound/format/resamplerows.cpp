#include "builtin/sound/format/resamplerows.h"

#define HWY_DISABLED_TARGETS (HWY_SSSE3 | HWY_AVX3_DL)
#undef HWY_TARGET_INCLUDE
#define HWY_TARGET_INCLUDE "builtin/sound/format/resamplerows.cpp"
#include <hwy/foreach_target.h>
#include <hwy/highway.h>

HWY_BEFORE_NAMESPACE();
namespace snd {
namespace HWY_NAMESPACE {
namespace hn = hwy::HWY_NAMESPACE;

constexpr int tapCount = Resampler::taps;

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
        const int32_t* first = run.in + (next.index - Resampler::leftReach) * run.inChannels;
        const int32_t* table = taps.table + next.phase * tapCount;
        put(out, first, table, taps.doubled + 2 * next.phase * tapCount);
        out += run.outChannels;
    }
    walk = latest;
    return done;
}

#if HWY_TARGET == HWY_SCALAR || HWY_TARGET == HWY_EMU128

HWY_INLINE int64_t sumOf(const int32_t* in, int channels, const int32_t* taps) {
    int64_t sum = 0;
    for (int k = 0; k < tapCount; ++k) sum += int64_t{taps[k]} * in[k * channels];
    return sum;
}

struct Pair {
    int64_t left, right;
};
HWY_INLINE Pair sumsOfTwo(const int32_t* in, const int32_t* taps, const int32_t*) {
    return {sumOf(in, 2, taps), sumOf(in + 1, 2, taps)};
}
HWY_INLINE int64_t sumOfOne(const int32_t* in, const int32_t* taps) { return sumOf(in, 1, taps); }

HWY_INLINE void manySums(int32_t* out, const int32_t* in, int channels, const int32_t* taps) {
    for (int c = 0; c < channels; ++c) out[c] = rounded<14>(sumOf(in + c, channels, taps));
}

#else

const hn::CappedTag<int32_t, 8> d32;
const hn::RepartitionToWide<decltype(d32)> d64;
constexpr int lanes = hn::MaxLanes(hn::CappedTag<int32_t, 8>());
using V32 = hn::Vec<hn::CappedTag<int32_t, 8>>;
using V64 = hn::Vec<hn::RepartitionToWide<hn::CappedTag<int32_t, 8>>>;

// The values of odd lanes in the place of the even ones.
HWY_INLINE V32 odds(V32 v) {
    const hn::RebindToUnsigned<decltype(d64)> du64;
    return hn::BitCast(d32, hn::ShiftRight<32>(hn::BitCast(du64, v)));
}

struct Pair {
    int64_t left, right;
};
HWY_INLINE Pair sumsOfTwo(const int32_t* in, const int32_t*, const int32_t* doubled) {
    V64 left = hn::Zero(d64), right = left;
    for (int k = 0; k < 2 * tapCount; k += lanes) {
        const V32 value = hn::LoadU(d32, in + k), tap = hn::LoadU(d32, doubled + k);
        left = hn::Add(left, hn::MulEven(value, tap));
        right = hn::Add(right, hn::MulEven(odds(value), tap));
    }
    HWY_ALIGN int64_t sums[lanes / 2];
    hn::Store(hn::Add(hn::InterleaveLower(d64, left, right), hn::InterleaveUpper(d64, left, right)), d64,
              sums);
    Pair pair{0, 0};
    for (int k = 0; k < lanes / 2; k += 2) {
        pair.left += sums[k];
        pair.right += sums[k + 1];
    }
    return pair;
}

HWY_INLINE int64_t sumOfOne(const int32_t* in, const int32_t* taps) {
    V64 sum = hn::Zero(d64);
    for (int k = 0; k < tapCount; k += lanes) {
        const V32 value = hn::LoadU(d32, in + k), tap = hn::LoadU(d32, taps + k);
        sum = hn::Add(sum, hn::Add(hn::MulEven(value, tap), hn::MulEven(odds(value), odds(tap))));
    }
    return hn::GetLane(hn::SumOfLanes(d64, sum));
}

// As many channels at a time as there are lanes. The last ones read into what follows.
HWY_INLINE void manySums(int32_t* out, const int32_t* in, int channels, const int32_t* taps) {
    for (int c = 0; c < channels; c += lanes) {
        V64 even = hn::Zero(d64), odd = even;
        for (int k = 0; k < tapCount; ++k) {
            const V32 value = hn::LoadU(d32, in + k * channels + c), tap = hn::Set(d32, taps[k]);
            even = hn::Add(even, hn::MulEven(value, tap));
            odd = hn::Add(odd, hn::MulEven(odds(value), tap));
        }
        HWY_ALIGN int64_t evens[lanes / 2], odds64[lanes / 2];
        hn::Store(even, d64, evens);
        hn::Store(odd, d64, odds64);
        for (int k = 0; k < std::min(lanes, channels - c); ++k)
            out[c + k] = rounded<14>(k % 2 ? odds64[k / 2] : evens[k / 2]);
    }
}

#endif

int makeInside(const RateRun& run, const RateTaps& taps, RateWalk& walk, int32_t* out, int n) {
    const auto walked = [&](auto put) HWY_ATTR { return walkRun(run, taps, walk, out, n, put); };
    using In = const int32_t*;
    if (run.inChannels == 1 && run.outChannels == 1)
        return walked([](int32_t* to, In in, In tap, In)
                          HWY_ATTR { to[0] = rounded<14>(sumOfOne(in, tap)); });
    if (run.inChannels == 1)
        return walked([](int32_t* to, In in, In tap, In)
                          HWY_ATTR { to[0] = to[1] = rounded<14>(sumOfOne(in, tap)); });
    if (run.inChannels == 2 && run.outChannels == 1)
        return walked([](int32_t* to, In in, In tap, In doubled) HWY_ATTR {
            const Pair sums = sumsOfTwo(in, tap, doubled);
            to[0] = rounded<15>(sums.left + sums.right);
        });
    if (run.inChannels == 2)
        return walked([](int32_t* to, In in, In tap, In doubled) HWY_ATTR {
            const Pair sums = sumsOfTwo(in, tap, doubled);
            to[0] = rounded<14>(sums.left);
            to[1] = rounded<14>(sums.right);
        });
    return walked([&](int32_t* to, In in, In tap, In) HWY_ATTR { manySums(to, in, run.inChannels, tap); });
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
