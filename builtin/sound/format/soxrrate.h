// The rate converter of high quality: libsoxr with the recipe SOXR_VHQ, 32-bit integers in and out,
// interleaved. Its first output sample lies at the time of the first input sample; what its filters hold back
// comes after more input.
#pragma once

#include <cstdint>
#include <memory>

struct soxr;

namespace snd {

class SoxrRate {
  public:
    // Null without memory, for rates that the library does not take, and in a build without it.
    static std::unique_ptr<SoxrRate> create(int channels, int inRate, int outRate);
    static bool isBuiltIn();
    ~SoxrRate();
    SoxrRate(const SoxrRate&) = delete;
    SoxrRate& operator=(const SoxrRate&) = delete;

    // Output samples that `count` more input samples can give at most.
    long long outputFor(long long count) const;
    // Takes input and makes output, at most `room` samples, which must be enough for the input (outputFor).
    // Returns how many, or -1 after a failure of the library.
    long long process(const int32_t* in, long long count, int32_t* out, long long room);

  private:
    SoxrRate(soxr* state, int channels, double ratio) : state_(state), channels_(channels), ratio_(ratio) {}

    soxr* state_;
    int channels_;
    double ratio_;  // output samples for an input sample
};

}  // namespace snd
