#include "core/transcode/link/video/framerange_p.h"

#include "core/measure/qvnum.h"

FrameRange::FrameRange(const MediaTime& inPoint, const MediaTime& outPoint, const QvFramerate& inRate)
    : start(static_cast<int>(inPoint.position(inRate))),
      stop(static_cast<int>(outPoint.position(inRate)) - 1),
      in(stop - start + 1) {}

void FrameRange::convert(const QvFramerate& inRate, const QvFramerate& outRate) {
    const bool halved = QvNum::equ(2.0 * outRate.rate().ratio(), inRate.rate().ratio(), QvRatio::tolerance);
    pairCompleted = halved && in % 2 != 0;  // two frames go into each one
    if (pairCompleted) {
        ++stop;
        ++in;
    }
    out = static_cast<int>(QvRatio::multyplyByRatio(in, outRate.rate(), inRate.rate()));
}
