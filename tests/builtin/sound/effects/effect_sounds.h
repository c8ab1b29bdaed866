// What the tests of sound effects share: sounds, and filters that are driven as a pipe does it.
#pragma once

#include <array>
#include <climits>
#include <cmath>
#include <numbers>
#include <random>

#include "builtin/sound/soundfilter.h"
#include "core/engine/status.h"
#include "core/measure/qvgeometry.h"
#include "core/value/anycontainer.h"
#include "tests/support/checks.h"

using Values = std::vector<int>;  // interleaved samples between the stages of a chain, 2^23 is full scale

constexpr int fullScale = 1 << 23;

inline QvPcm soundOf(const Values& values, int channels, int rate = 48000) {
    QvPcm pcm;
    const int samples = static_cast<int>(values.size()) / channels;
    EXPECT_EQ(pcm.init(samples, channels, 4, rate), 0);
    pcm.setSamples(samples);
    if (samples > 0) std::memcpy(pcm.ptr(0), values.data(), values.size() * sizeof(int));
    return pcm;
}

// Noise with pauses and with the ends of the range in it.
inline Values noise(std::size_t count, unsigned seed, int peak = fullScale - 1) {
    std::mt19937 random(seed);
    std::uniform_int_distribution<int> any(-peak, peak), one(0, 99);
    constexpr int extremes[] = {0, 1, -1, fullScale, -fullScale, INT_MAX, INT_MIN};
    Values values(count);
    for (std::size_t i = 0; i < count; ++i) {
        const bool pause = i / 500 % 3 == 2;
        values[i] = one(random) == 0 ? extremes[i % std::size(extremes)]
                    : pause          ? any(random) >> 18
                                     : any(random);
    }
    return values;
}

inline Values sine(int samples, int channels, double amplitude, double hertz, int rate = 48000) {
    Values values;
    for (int i = 0; i < samples; ++i) {
        const double phase = 2 * std::numbers::pi * hertz * i / rate;
        values.insert(values.end(), static_cast<std::size_t>(channels),
                      static_cast<int>(std::lround(amplitude * fullScale * std::sin(phase))));
    }
    return values;
}

// An initialised and open filter with these parameters.
template <class Filter>
class OpenedSound {
  public:
    explicit OpenedSound(const AnyDict& params = {}) {
        EXPECT_EQ(filter.init(), 0);
        EXPECT_EQ(filter.setParamDict(params), 0) << filter.errorDesc();
        EXPECT_EQ(filter.open(), 0);
    }
    // All of the sound, in blocks of `block` samples (0: of changing sizes).
    Values through(const Values& in, int channels, int block, int rate = 48000) {
        Values out;
        const int samples = static_cast<int>(in.size()) / channels;
        for (int at = 0, turn = 0; at < samples; ++turn) {
            const int count = std::min(block > 0 ? block : turn * 37 % 1001, samples - at);
            const auto first = in.begin() + std::ptrdiff_t{at} * channels;
            QvPcm pcm = soundOf(Values(first, first + std::ptrdiff_t{count} * channels), channels, rate);
            pcm.setPosition(at + count);
            EXPECT_EQ(filter.write(pcm), 0) << filter.errorDesc();
            take(out);
            at += count;
        }
        return out;
    }
    void take(Values& out) {
        const int count = filter.samples();
        if (count > 0) {
            const auto* values = reinterpret_cast<const int*>(filter.pcm()->ptr(0));
            out.insert(out.end(), values, values + std::ptrdiff_t{count} * filter.pcm()->channels());
        }
        filter.erase(count);
        EXPECT_EQ(filter.samples(), 0);
    }

    Filter filter;
};

// The same output for blocks of any size.
template <class Filter>
Values throughBlocks(const AnyDict& params, const Values& in, int channels, int rate = 48000) {
    const Values whole = OpenedSound<Filter>(params).through(in, channels, INT_MAX, rate);
    for (const int block : {0, 1, 64, 4096})
        EXPECT_EQ(OpenedSound<Filter>(params).through(in, channels, block, rate), whole) << block;
    return whole;
}
