// The sums of taps and samples of the rate converter, compiled for each vector unit; every unit gives the
// same bytes.
#pragma once

#include <algorithm>
#include <cmath>
#include <cstddef>
#include <cstdint>

#include "builtin/sound/format/resampler.h"

namespace snd {

// A sum with `shift` fraction bits as a value: halves are rounded down, and what is out of range takes the
// nearest bound.
template <int shift>
int32_t rounded(double sum) {
    constexpr double one = 1 << shift, justBelowHalf = one / 2 - 1;
    return static_cast<int32_t>(
        std::clamp<double>(std::floor((sum + justBelowHalf) / one), INT32_MIN, INT32_MAX));
}

struct RateTaps {
    const double* table;    // as Resampler::table
    const double* doubled;  // each tap twice
};

// Input samples in a row, and the positions from `begin` to before `end` whose 16 samples are all there.
// Resampler::padding values after those samples may be read.
struct RateRun {
    const double* in;
    int64_t begin, end;
    int inChannels, outChannels;
};

// Makes output samples as long as they lie inside the run, at most n. Returns how many; the walk is then at
// the last one.
int makeInside(const RateRun& run, const RateTaps& taps, RateWalk& walk, int32_t* out, int n);

}  // namespace snd
