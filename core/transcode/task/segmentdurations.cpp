#include <algorithm>

#include "core/arch/qvassert.h"
#include "core/decode/qvdecoder.h"
#include "core/engine/log/qvlog.h"
#include "core/transcode/task/qvtranscodetask.h"
#include "core/transcode/task/segmentdurations_p.h"

namespace {

constexpr double longestSeconds = 2592000.0;

// The index of the shortest of a type, or of all but subpictures for 0; -1 if there is none below the limit,
// which becomes its duration.
int shortest(const QvIStreamList& streams, int type, MediaTime& limit) {
    int winner = -1;
    for (int i = 0; i < streams.size(); ++i) {
        const QvIStream& stream = *streams.at(i);
        if (type == 0 ? stream.type == qvSubpicStream : stream.type != type) continue;
        if (const MediaTime own = stream.effectiveDuration(); own < limit) {
            limit = own;
            winner = i;
        }
    }
    return winner;
}

bool sameFile(const QvIStream& a, const QvIStream& b) {
    return a.decoder == b.decoder || a.filename() == b.filename();
}

// An out point of 0 would be the end of the stream: where nothing is to play from the start, it is a tick
// later, which is less than a frame or a sample.
void endAt(QvIStream& stream, const MediaTime& time) { stream.setOutPoint(std::max(time, MediaTime(1))); }

void endWith(QvIStream& stream, const QvIStream& winner, const MediaTime& limit) {
    if (stream.type == qvVideoStream) {
        endAt(stream, stream.inPoint() + limit);
        return;
    }
    const bool bound = sameFile(stream, winner);
    if (bound) stream.setInPoint(winner.inPoint());
    if (stream.effectiveDuration() > limit)
        endAt(stream, bound ? winner.outPoint() : stream.inPoint() + limit);
}

}  // namespace

std::string qvStreamLabel(const QvIStream& stream) {
    const Any name = stream.filename().toString();
    return std::string(name.asString("")) + " " + QvTask::typeName(stream.type) + "#" +
           std::to_string(stream.number);
}

int qvAdjustSegmentDurations(const QvIStreamList& streams) {
    for (const QvIStream* stream : streams)
        qv_dbg()->debug("[Task] %s: duration=%f, in=%f, out=%f, eff.dur=%f", qvStreamLabel(*stream).c_str(),
                        stream->duration().seconds(), stream->inPoint().seconds(),
                        stream->outPoint().seconds(), stream->effectiveDuration().seconds());
    const bool withVideo = std::any_of(streams.begin(), streams.end(),
                                       [](const QvIStream* stream) { return stream->type == qvVideoStream; });
    MediaTime limit(longestSeconds);
    const int index = shortest(streams, withVideo ? qvVideoStream : 0, limit);
    if (index < 0) {
        qv_dbg()->error("BatchTask: invalid streams in segmentAdjustDurations");
        QV_FAIL("BatchTask.segmentAdjustDurations");
    }
    const QvIStream& winner = *streams.at(index);
    for (QvIStream* stream : streams) {
        if (stream == &winner || stream->type == qvSubpicStream) continue;
        if (stream->effectiveDuration() == limit && stream->inPoint() == winner.inPoint()) continue;
        endWith(*stream, winner, limit);
        qv_dbg()->info("[Task] %s: updated in-out pts, duration=%f, in=%f, out=%f, eff.dur=%f",
                       qvStreamLabel(*stream).c_str(), stream->duration().seconds(),
                       stream->inPoint().seconds(), stream->outPoint().seconds(),
                       stream->effectiveDuration().seconds());
    }
    return index;
}
