// Measures how loud a sound is: loudness by ITU-R BS.1770-4 and EBU R 128, loudness range by EBU Tech 3342,
// true peak, sample peak and RMS.
#pragma once

#include <limits>
#include <memory>

#include "core/arch/api.h"

class QvPcm;

// Where a mask gives the places of the channels, those at the sides and at the back are surrounds. Without
// one channels count as they lie in WAVE files: one and two as left and right, three with a centre, four as
// left, right and two surrounds, five with a centre before these, six with centre and low frequency effects
// before them, eight with two more surrounds; with any other number each channel counts as a front one.
// Surrounds weigh 1.41, low frequency effects nothing; peaks and RMS are of all channels.
//
// Samples of one byte are unsigned, wider ones signed; those of four bytes have full scale at 2^23, as
// between the filters of a chain. One thread at a time.
class QV_API QvLoudness {
  public:
    static constexpr double silence = -std::numeric_limits<double>::infinity();
    static constexpr int maxChannels = 64;

    QvLoudness();
    ~QvLoudness();
    QvLoudness(const QvLoudness&) = delete;
    QvLoudness& operator=(const QvLoudness&) = delete;

    // Forgets what was measured. `channelMask`: the places of the channels as in WAVEFORMATEXTENSIBLE, one
    // bit a channel from the lowest on, where channels without a bit are front ones; 0 for none. 0;
    // QvStatus::invalidArgument for a channel count or a rate that can't be measured; QvStatus::outOfMemory.
    int init(int channels, int samplerate, long long channelMask = 0);
    // Adds all filled samples. 0; QvStatus::illegalState before init; QvStatus::invalidArgument for another
    // number of channels; QvStatus::outOfMemory.
    int add(const QvPcm& pcm);

    long long samples() const;  // added since init
    // `silence` where nothing is loud enough: the loudness gate is at -70 LUFS.
    double integrated() const;  // LUFS
    double range() const;       // LU, 0 where nothing is loud enough
    double truePeak() const;    // dBTP, the highest of all channels, never below samplePeak
    double samplePeak() const;  // dBFS
    double rms() const;         // dBFS, where a full-scale square wave has 0

  private:
    struct State;
    std::unique_ptr<State> state_;
};
