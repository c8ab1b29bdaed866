#include "builtin/muxers/streamcodec.h"

#include "core/encode/qvmuxer.h"
#include "core/engine/modules/qvregistry.h"
#include "core/preset/qvpresetmgr.h"
#include "core/stream/qvbufstrm.h"

int qvIntParam(const QvCodec& codec, const char* name, int fallback) {
    const Any value = codec.getParam(name);
    return value.isInt() ? value.toInt32() : fallback;
}

Any qvStreamExtension(QvBufStream& stream, const char* fallback) {
    if (const auto* encoder = stream.atachee())
        if (Any extension = encoder->getParam("extension"); extension.isText() && extension.isTrue())
            return extension;
    const auto& own = stream.getParam("extension");
    return own.isText() && own.isTrue() ? own : Any(fallback);
}

double qvEstimateSecKb(const QvMuxer& muxer) {
    double sum = 0;
    for (const int type : {qvVideoStream, qvAudioStream})
        for (int nr = 0; nr < muxer.nrStreams(type); ++nr)
            if (const auto* encoder = muxer.stream(type, nr)->atachee()) {
                const Any part = encoder->getParam("estimateSecKb");
                if (part.isInt() || part.isFloat()) sum += part.toDouble();
            }
    return sum;
}

AnyVector qvMuxerCodecs(const QvMuxer& muxer, int kind) {
    const auto* presets = qv_registry()->presetMgr();
    return presets ? presets->getCompatible(muxer.name(), kind) : AnyVector();
}
