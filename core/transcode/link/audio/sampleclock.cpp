#include "core/transcode/link/audio/sampleclock_p.h"

#include <utility>

#include "core/engine/qvutil.h"

MediaTime SampleClock::timeOf(long long sample, int samplerate) {
    const MediaTime time(sample, samplerate, MediaTime::defaultTimescale);
    return time.position(samplerate) < sample ? time + MediaTime(1) : time;
}

void SampleClock::setRange(const MediaTime& inPoint, const MediaTime& outPoint) {
    inStart_ = inPoint.position(inRate_);
    inEnd_ = outPoint.position(inRate_);
    outStart_ = inPoint.position(outRate_);
    totalOut_ = MediaTime(inEnd_, inRate_).position(outRate_) - outStart_;
}

void SampleClock::passThrough() {
    outRate_ = inRate_;
    totalOut_ = inEnd_ - inStart_;
}

long long SampleClock::samplesFor(int frames, const QvFramerate& rate) const {
    return QvUtil::samplesForFrames(frames, rate, outRate_);
}

bool SampleClock::wroteSilence(long long samples) {
    wrote(samples);
    return !std::exchange(silent_, true);
}

double SampleClock::percent() const {
    const long long totalIn = inEnd_ - inStart_;
    if (totalIn < 1) return 0.0;
    return static_cast<double>(written_ - 1) * 100.0 / static_cast<double>(totalIn) * inRate_ / outRate_;
}
