// The four stages of the dynamics processor, on one channel of interleaved samples.
//
// Each follows its input with an envelope: e = (1 - R) e + A max(|x| - e, 0). The release R always acts and
// the attack A adds to it. Full scale is 2^23, as everywhere between the stages of a chain.
#pragma once

#include <array>

namespace dynamics {

constexpr int maxChannels = 8;

// A level in dB as an amplitude: 10^(dB / 20) of full scale, in steps of 2^8.
double thresholdOf(double dB);

// The share of the way to a new level that an envelope goes within one sample.
double attackShare(double microseconds, int samplerate);
double releaseShare(double milliseconds, int samplerate);

// What a stage remembers of a channel from write to write.
struct Channel {
    double envelope = 0;
    int below = 0, above = 0;  // samples since the envelope crossed the threshold; the noise gate's
};

struct Work {
    double attack = 0;  // shares, see above
    double release = 0;
    double threshold = 0;
    double ratio = 1;
    int ramp = 0;  // of the noise gate, in samples
};

// Reads `samples` values that lie `step` apart and writes as many, with the same step.
using Stage = void (*)(const Work& work, Channel& channel, const int* from, int* to, int samples, int step);

void limit(const Work& work, Channel& channel, const int* from, int* to, int samples, int step);
void compress(const Work& work, Channel& channel, const int* from, int* to, int samples, int step);
void expand(const Work& work, Channel& channel, const int* from, int* to, int samples, int step);
void gate(const Work& work, Channel& channel, const int* from, int* to, int samples, int step);

constexpr std::array<Stage, 4> stages = {limit, compress, expand, gate};  // in the order of the chain

}  // namespace dynamics
