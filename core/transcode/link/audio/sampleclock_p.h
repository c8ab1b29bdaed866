// Which samples an audio link takes from its input, and how many it owes to its output. One sample is one of
// every channel.
//
//     input    0 . . inStart . . . . . . . . . inEnd . . . length
//                       |<------- totalIn ------->|
//     output            |<-- totalOut, at the output's rate -->| silence, as long as samples are asked for
#pragma once

#include "core/measure/qvgeometry.h"

class SampleClock {
  public:
    SampleClock() = default;
    // Nothing written yet.
    SampleClock(int inSamplerate, int outSamplerate) : inRate_(inSamplerate), outRate_(outSamplerate) {}

    // An instant within the sample. Not every rate divides the timescale: where a tick before the sample is
    // meant, the next one is taken, since its position would otherwise be the sample before.
    static MediaTime timeOf(long long sample, int samplerate);

    void setRange(const MediaTime& inPoint, const MediaTime& outPoint);
    // Smart rendering: the output has the input's samples.
    void passThrough();

    // Samples of the output that belong to the first `frames` frames.
    long long samplesFor(int frames, const QvFramerate& rate) const;
    void wrote(long long samples) { written_ += samples; }
    // True for the first silence alone.
    bool wroteSilence(long long samples);
    bool complete() const { return written_ >= totalOut_; }  // the rest is silence
    // Percent of the range, as the position of the last sample written: below 0 before the first one.
    double percent() const;

    int inRate() const { return inRate_; }
    int outRate() const { return outRate_; }
    long long inStart() const { return inStart_; }
    long long inEnd() const { return inEnd_; }
    long long outStart() const { return outStart_; }
    long long outEnd() const { return outStart_ + totalOut_; }
    long long totalOut() const { return totalOut_; }
    long long written() const { return written_; }

  private:
    int inRate_ = 0;  // samples a second
    int outRate_ = 0;
    long long inStart_ = 0;
    long long inEnd_ = 0;
    long long outStart_ = 0;
    long long totalOut_ = 0;
    long long written_ = 0;
    bool silent_ = false;
};
