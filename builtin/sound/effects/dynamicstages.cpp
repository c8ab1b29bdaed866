#include "builtin/sound/effects/dynamicstages.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <cstddef>

#include "builtin/sound/soundvalues.h"

namespace {

using dynamics::Channel;
using dynamics::Work;

// An envelope that falls this low is 0: no sample can tell, and arithmetic on denormal numbers is slow.
constexpr double inaudible = 1e-100;

double follow(const Work& work, double envelope, int sample) {
    const double rise = std::max(std::fabs(static_cast<double>(sample)) - envelope, 0.0);
    return (1 - work.release) * envelope + work.attack * rise;
}

// `apply` makes the output from a sample and the envelope at it.
template <class Apply>
void run(const Work& work, Channel& channel, const int* from, int* to, int samples, int step, Apply apply) {
    double envelope = channel.envelope;
    for (std::ptrdiff_t i = 0, end = std::ptrdiff_t{samples} * step; i < end; i += step) {
        envelope = follow(work, envelope, from[i]);
        to[i] = apply(from[i], envelope);
    }
    channel.envelope = envelope < inaudible ? 0 : envelope;
}

// |sample|^exponent with the sample's sign. Near an envelope of 1, the smallest step of 24 bits, the exponent
// grows without bounds or is no number; what does not fit a sample there is silence.
int raised(int sample, double exponent, double envelope) {
    if (sample == 0) return 0;
    const double magnitude =
        std::trunc(std::pow(10.0, std::log10(std::fabs(static_cast<double>(sample))) * exponent));
    if (!(magnitude <= INT_MAX)) {
        if (!(envelope > 1)) return 0;
        return sample < 0 ? -INT_MAX : INT_MAX;
    }
    return static_cast<int>(sample < 0 ? -magnitude : magnitude);
}

// The exponent that draws a level in decibels towards the threshold or away from it: `share` of the threshold
// and `rest` of the level itself.
struct Curve {
    double thresholdShare, rest;
    double exponent(double envelope) const { return thresholdShare / (20 * std::log10(envelope)) + rest; }
};

Curve curveOf(const Work& work, double rest) { return {20 * std::log10(work.threshold) * (1 - rest), rest}; }

constexpr double stepsOfLevel = 32767;

}  // namespace

namespace dynamics {

double thresholdOf(double dB) { return std::trunc(std::pow(10.0, dB / 20) * stepsOfLevel) * 256; }

// The factor 2.2 makes the times those from 10 to 90 percent.
double attackShare(double microseconds, int samplerate) {
    return 1 - std::exp(1 / static_cast<float>(samplerate) * -2.2 / (microseconds / 1000 / 1000));
}

double releaseShare(double milliseconds, int samplerate) {
    return 1 - std::exp(1 / static_cast<float>(samplerate) * -2.2 / (milliseconds / 1000));
}

void limit(const Work& work, Channel& channel, const int* from, int* to, int samples, int step) {
    run(work, channel, from, to, samples, step, [&](int sample, double envelope) {
        return envelope > work.threshold ? saturated(sample * (work.threshold / envelope)) : sample;
    });
}

void compress(const Work& work, Channel& channel, const int* from, int* to, int samples, int step) {
    const Curve curve = curveOf(work, 1 / work.ratio);
    run(work, channel, from, to, samples, step, [&](int sample, double envelope) {
        return envelope > work.threshold ? raised(sample, curve.exponent(envelope), envelope) : sample;
    });
}

void expand(const Work& work, Channel& channel, const int* from, int* to, int samples, int step) {
    const Curve curve = curveOf(work, work.ratio);
    run(work, channel, from, to, samples, step, [&](int sample, double envelope) {
        return envelope < work.threshold ? raised(sample, curve.exponent(envelope), envelope) : sample;
    });
}

void gate(const Work& work, Channel& channel, const int* from, int* to, int samples, int step) {
    int below = channel.below, above = channel.above;
    run(work, channel, from, to, samples, step, [&](int sample, double envelope) {
        double gain = 0;
        if (envelope < work.threshold) {
            below = below < INT_MAX ? below + 1 : below;
            above = 0;
            gain = std::max(1 - static_cast<double>(below) / work.ramp, 0.0);
        } else {
            above = above < INT_MAX ? above + 1 : above;
            below = 0;
            gain = std::min(static_cast<double>(above) / work.ramp, 1.0);
        }
        return saturated(sample * gain);
    });
    channel.below = below;
    channel.above = above;
}

}  // namespace dynamics
