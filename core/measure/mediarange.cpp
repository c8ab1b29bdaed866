#include "core/measure/mediarange.h"

#include "core/measure/qvnum.h"

MediaTime qvInstantOf(long long unit, const QvRatio& rate) {
    const MediaTime time(unit, rate, MediaTime::defaultTimescale);
    return time.position(rate) < unit ? time + MediaTime(1) : time;
}

QvFrameRange::QvFrameRange(const MediaTime& inPoint, const MediaTime& outPoint, const QvFramerate& inRate)
    : start(static_cast<int>(inPoint.position(inRate))),
      stop(static_cast<int>(outPoint.position(inRate)) - 1),
      in(stop - start + 1) {}

void QvFrameRange::convert(const QvFramerate& inRate, const QvFramerate& outRate) {
    const bool halved = QvNum::equ(2.0 * outRate.rate().ratio(), inRate.rate().ratio(), QvRatio::tolerance);
    pairCompleted = halved && in % 2 != 0;  // two frames go into each one
    if (pairCompleted) {
        ++stop;
        ++in;
    }
    out = static_cast<int>(QvRatio::multyplyByRatio(in, outRate.rate(), inRate.rate()));
}

QvSampleRange::QvSampleRange(const MediaTime& inPoint, const MediaTime& outPoint, int inRate, int outRate)
    : inStart(inPoint.position(inRate)),
      inEnd(outPoint.position(inRate)),
      outStart(inPoint.position(outRate)),
      out(MediaTime(inEnd, inRate).position(outRate) - outStart) {}
