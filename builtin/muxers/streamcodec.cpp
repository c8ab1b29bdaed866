#include "builtin/muxers/streamcodec.h"

#include <cstring>

#include "core/stream/qvbufstrm.h"

bool qvIsCodec(const QvCodec* codec, const char* name) {
    return codec && std::strcmp(codec->name(), name) == 0;
}

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
