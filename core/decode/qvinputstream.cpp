#include "core/decode/qvinputstream.h"

#include <algorithm>

#include "core/decode/qvdecoder.h"
#include "core/measure/exactmath_p.h"
#include "core/measure/mediarange.h"

namespace {

// Stored points can hold anything: they are brought to where they can be compared, none is negative, and what
// is no pair of times is as good as absent.
MediaTime usable(const MediaTime& time) {
    const long long ticks =
        time.timescale() == MediaTime::defaultTimescale
            ? time.value()
            : qvmath::mulDiv(time.value(), MediaTime::defaultTimescale, 1, time.timescale());
    return MediaTime(std::max(ticks, 0LL));
}

std::optional<InOutPoints> pointsOf(const ProcessParams& params) {
    auto points = params.inOutPoints();
    if (!points || points->count() == 0) return std::nullopt;
    if (!points->at(0).isMediaTime() || !points->at(1).isMediaTime()) return std::nullopt;
    return points;
}

// Not every rate divides the timescale: the end of a stream must not lie within its last frame or sample.
MediaTime wholeUnits(const MediaTime& end, long long units, const QvRatio& rate) {
    return rate.ratio() > 0 && end.position(rate) == units - 1 ? qvInstantOf(units, rate) : end;
}

MediaTime videoDuration(QvDecodePipe& decoder, int number) {
    const MediaTime end = decoder.duration(qvVideoStream, number);
    const Any rate = decoder.getVideoParam(number, "framerate");
    return rate.isFramerate() ? wholeUnits(end, decoder.nrFrames(number), rate.asFramerate().rate()) : end;
}

MediaTime audioDuration(QvDecodePipe& decoder, int number) {
    const MediaTime end = decoder.duration(qvAudioStream, number);
    const Any rate = decoder.getAudioParam(number, "samplerate");
    return rate.isInt() ? wholeUnits(end, decoder.nrSamples(number), QvRatio(rate.toInt32(), 1)) : end;
}

// Subpictures last as long as the picture that they are for, and otherwise as they say themselves.
MediaTime subpicDuration(QvDecodePipe& decoder, int number) {
    if (number < decoder.nrStreams(qvVideoStream)) return videoDuration(decoder, number);
    const Any seconds = decoder.getSubpicParam(number, "duration");
    return seconds.isFloat() ? MediaTime(seconds.asDouble()) : MediaTime();
}

}  // namespace

QvIStream::~QvIStream() = default;

Any QvIStream::filename() const { return decoder ? decoder->QvCodec::getParam("filename") : Any(); }

MediaTime QvIStream::inPoint() const {
    const auto points = pointsOf(params);
    return points ? usable(points->inPoint()) : MediaTime();
}

MediaTime QvIStream::outPoint() const {
    const auto points = pointsOf(params);
    const MediaTime out = points ? usable(points->outPoint()) : MediaTime();
    return out.value() != 0 ? out : duration();
}

void QvIStream::setInPoint(const MediaTime& time) {
    auto points = pointsOf(params).value_or(InOutPoints());
    points.setInPoint(time);
    params.setInOutPoints(points);
}

void QvIStream::setOutPoint(const MediaTime& time) {
    auto points = pointsOf(params).value_or(InOutPoints());
    points.setOutPoint(time);
    params.setInOutPoints(points);
}

MediaTime QvIStream::duration() const {
    if (!decoder) return MediaTime();
    if (type == qvSubpicStream) return subpicDuration(*decoder, number);
    return type == qvVideoStream ? videoDuration(*decoder, number) : audioDuration(*decoder, number);
}

MediaTime QvIStream::effectiveDuration() const {
    const MediaTime end = std::min(outPoint(), duration());
    return std::max(end - inPoint(), MediaTime());
}

bool QvIStream::operator==(const QvIStream& other) const {
    return decoder == other.decoder && type == other.type && number == other.number;
}
