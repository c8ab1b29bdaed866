#include "core/preset/presetinfo_p.h"

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

std::string joined(const AnyVector& parts) { return parts.join("; ").asString(""); }

}  // namespace

std::string qvPipeInfo(const QvEncodePipe& pipe) {
    AnyVector parts;
    if (const QvMuxer* muxer = pipe.getMuxer()) add(parts, "Format", muxer->displayName());
    addStream(parts, pipe, qvVideoStream, "Video");
    addStream(parts, pipe, qvAudioStream, "Audio");
    return joined(parts);
}

std::string qvStoredInfo(const AnyDict& preset) {
    static constexpr const char* rows[][2] = {{"Format", "muxer.name"},
                                              {"Video", "streams.vids.0.codec.name"},
                                              {"Audio", "streams.auds.0.codec.name"}};
    AnyVector parts;
    for (const auto& [what, path] : rows)
        if (const Any* name = preset.descendant("%s", path); name && name->isText())
            add(parts, what, name->toString().asString(""));
    return parts.empty() ? "Info not available" : joined(parts);
}
