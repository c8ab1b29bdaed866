#include <algorithm>

#include "core/measure/exactmath_p.h"
#include "core/measure/mediarange.h"
#include "core/transcode/batch/segmentspan_p.h"

SegmentSpan qvSegmentSpan(const QvIStream& stream, const QvRatio& inRate, const QvRatio& outRate) {
    SegmentSpan span;
    if (inRate.ratio() <= 0 || outRate.ratio() <= 0) return span;
    span.in = std::max(stream.inPoint(), MediaTime());
    span.out = std::max(std::min(stream.outPoint(), stream.duration()), span.in);
    span.first = span.in.position(inRate);
    span.count = span.out.position(inRate) - span.first;
    const bool whole = qvInstantOf(span.first, inRate) == span.in &&
                       qvInstantOf(span.first + span.count, inRate) == span.out;
    span.owed = whole ? qvmath::mulDiv(span.count, outRate.num, inRate.den,
                                       static_cast<qvmath::Wide>(outRate.den) * inRate.num)
                      : span.duration().position(outRate);
    return span;
}
