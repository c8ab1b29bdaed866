#include "core/transcode/link/audio/sampleclock_p.h"

#include <utility>

#include "core/engine/qvutil.h"

void SampleClock::setRange(const MediaTime& inPoint, const MediaTime& outPoint) {
    range_ = QvSampleRange(inPoint, outPoint, inRate_, outRate_);
}

void SampleClock::passThrough() {
    outRate_ = inRate_;
    range_.out = range_.inEnd - range_.inStart;
}

long long SampleClock::samplesFor(int frames, const QvFramerate& rate) const {
    return QvUtil::samplesForFrames(frames, rate, outRate_);
}

bool SampleClock::wroteSilence(long long samples) {
    wrote(samples);
    return !std::exchange(silent_, true);
}

double SampleClock::percent() const {
    const long long totalIn = range_.inEnd - range_.inStart;
    if (totalIn < 1) return 0.0;
    return static_cast<double>(written_ - 1) * 100.0 / static_cast<double>(totalIn) * inRate_ / outRate_;
}
