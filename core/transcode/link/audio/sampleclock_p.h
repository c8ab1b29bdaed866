// Which samples an audio link takes from its input, and how many it owes to its output (QvSampleRange). After
// the last of them it writes silence, as long as samples are asked for.
#pragma once

#include "core/measure/mediarange.h"

class SampleClock {
  public:
    SampleClock() = default;
    // Nothing written yet.
    SampleClock(int inSamplerate, int outSamplerate) : inRate_(inSamplerate), outRate_(outSamplerate) {}

    void setRange(const MediaTime& inPoint, const MediaTime& outPoint);
    // Smart rendering: the output has the input's samples.
    void passThrough();

    // Samples of the output that belong to the first `frames` frames.
    long long samplesFor(int frames, const QvFramerate& rate) const;
    void wrote(long long samples) { written_ += samples; }
    // True for the first silence alone.
    bool wroteSilence(long long samples);
    bool complete() const { return written_ >= range_.out; }  // the rest is silence
    // Percent of the range, as the position of the last sample written: below 0 before the first one.
    double percent() const;

    int inRate() const { return inRate_; }
    int outRate() const { return outRate_; }
    long long inStart() const { return range_.inStart; }
    long long inEnd() const { return range_.inEnd; }
    long long outStart() const { return range_.outStart; }
    long long outEnd() const { return range_.outStart + range_.out; }
    long long totalOut() const { return range_.out; }
    long long written() const { return written_; }

  private:
    int inRate_ = 0;  // samples a second
    int outRate_ = 0;
    QvSampleRange range_;
    long long written_ = 0;
    bool silent_ = false;
};
