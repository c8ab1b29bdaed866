#include "core/arch/qvassert.h"
#include "core/encode/muxerlimits_p.h"
#include "core/encode/qvmuxer.h"
#include "core/engine/log/qvlog.h"

MuxerLimits MuxerLimits::of(const QvMuxer* muxer, const char* complaint) {
    QV_ASSERT_MSG(muxer, "EncodePipe: muxer is null.");
    Any answer;
    muxer->getParam("maxStreams", answer);
    if (!answer.isDict()) {
        qv_dbg()->error(complaint, muxer->name());
        QV_FAIL_PLAIN();
    }
    const auto& dict = answer.asDict();
    return {dict.getInt32("vids", 0), dict.getInt32("auds", 0), dict.getInt32("subs", 0),
            dict.getInt32("total", 0)};
}

int MuxerLimits::ofType(int type) const {
    switch (type) {
        case 0: return total;
        case qvVideoStream: return video;
        case qvAudioStream: return audio;
        case qvSubpicStream: return subpic;
        default: QV_FAIL("EncodePipe.maxStreams: invalid stream type");
    }
}

int MuxerLimits::room(int type, int ofThis, int inAll) const {
    const int left = total - inAll;
    if (type == 0) return left;
    const int limit = ofType(type);
    if (limit == 0) return -1;
    return left <= 0 ? 0 : limit - ofThis;
}

int qvStreamRoom(const QvMuxer* muxer, int type, int ofThis, int inAll) {
    return MuxerLimits::of(muxer,
                           "EncodePipe.canAddStreams: muxer '%s' returned invalid value for 'maxStreams'")
        .room(type, ofThis, inAll);
}
