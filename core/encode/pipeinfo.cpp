#include "core/encode/pipeinfo_p.h"

#include "core/encode/qvencodepipe.h"
#include "core/value/any.h"

namespace {

void add(AnyVector& parts, const char* what, const char* text) {
    parts.append(Any::sprintf("%s: %s", what, text));
}

void addStream(AnyVector& parts, const QvEncodePipe& pipe, int type, const char* what) {
    const QvEncoder* encoder = pipe.encoder(type, 0);
    if (!encoder) return;
    AnyVector words{Any(encoder->displayName())}, described;
    pipe.getStreamDesc(type, 0, described);
    words.extend(described);
    add(parts, what, words.join(", ").asString(""));
}

}  // namespace

std::string qvPipeInfo(const QvEncodePipe& pipe) {
    AnyVector parts;
    if (const QvMuxer* muxer = pipe.getMuxer()) add(parts, "Format", muxer->displayName());
    addStream(parts, pipe, qvVideoStream, "Video");
    addStream(parts, pipe, qvAudioStream, "Audio");
    return parts.join("; ").asString("");
}
