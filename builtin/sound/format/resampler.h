// The rate converter of standard quality: a windowed sinc of 16 taps in 64 phases, without interpolation
// between phases, in whole numbers. They are kept as doubles, which hold them exactly: a tap has 15 bits, a
// sample 32, and 16 products are added.
//
// An output sample lies at input position p + phase / 64 and is the sum over the input samples p - 7 to p +
// 8, weighted by the taps of its phase. Positions count from the first sample of the view that a call is
// given; what it lacks counts as zero, as do the samples before the first one of a stream.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

namespace snd {

// Where the next output sample is taken from: a walk over input positions and phases in steps of
// inRate / outRate, in whole numbers.
struct RateWalk {
    int64_t index = -1;  // input position of the latest output sample
    int phase = 0;       // 0 to 63, of the latest output sample
    int accumulator = 0;
    int modulus = 1;  // the output rate
    // A step: what is added to the phase and to the accumulator. The accumulator stays in 0 to the modulus.
    int wholePhases = 0, rest = 0;

    void advance() {
        accumulator += rest;
        phase += wholePhases;
        if (accumulator < 0) {
            accumulator += modulus;
            ++phase;
        } else if (accumulator > modulus) {
            accumulator -= modulus;
            --phase;
        }
        index += (phase >> 6) + 1;
        phase &= 63;
    }
};

// How much input a number of output samples, above 0, takes.
struct RateNeed {
    int inRate, outRate;

    // Input samples, taps included.
    long long inputFor(long long n) const;
    // Samples that a view must have so that none of n output samples lacks input.
    long long viewFor(long long n) const;
};

class Resampler {
  public:
    static constexpr int phases = 64, taps = 16, leftReach = 7, rightReach = 8;
    static constexpr int maxRate = 1 << 24;
    // Values after the end of a view that may be read, but have no effect.
    static constexpr int padding = 16;

    // Rates 1 to maxRate, which differ. Channels are unchanged, become one of two, or two of one.
    Resampler(int inChannels, int outChannels, int inRate, int outRate);

    int inChannels() const { return inChannels_; }
    int outChannels() const { return outChannels_; }
    RateNeed need() const { return {inRate_, outRate_}; }

    // Makes n output samples of a view of `count` input samples.
    void make(const double* view, long long count, int32_t* out, int n);
    // Makes output samples up to the last input sample, at most n. Returns how many.
    int makeAll(const double* view, long long count, int32_t* out, int n);
    // How many samples of the view are no longer needed. Seven samples stay as history.
    long long consume();

    // 1024 taps, 16 of each phase together. The tap of sample p - 7 comes first.
    const std::vector<double>& table() const { return table_; }

  private:
    void makeOne(const double* view, long long count, int32_t* out) const;

    int inChannels_, outChannels_, inRate_, outRate_;
    RateWalk walk_;
    std::vector<double> table_;
    std::vector<double> doubled_;  // each tap twice, for two channels
};

}  // namespace snd
