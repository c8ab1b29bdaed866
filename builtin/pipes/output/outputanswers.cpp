#include "builtin/pipes/output/outputanswers.h"

#include <cstring>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/preset/qvpresetmgr.h"

bool OutputAnswers::get(const char* name, Any& value) const {
    using Self = OutputAnswers;
    struct Row {
        const char* name;
        void (*get)(const Self&, Any&);
        const char* obsolete = nullptr;  // the text of the assertion
    };
    static constexpr Row rows[] = {
        {"preset", [](const Self& s, Any& v) { s.preset(v); }},
        {"presets", [](const Self& s, Any& v) { s.presets(v); }},
        {"srPossible", [](const Self& s, Any& v) { s.srPossible(v); }},
        {"profile", [](const Self& s, Any& v) { v = s.preset_.preset().profile(); }},
        {"origProfile", [](const Self& s, Any& v) { s.origProfile(v); }},
        {"pal", [](const Self& s, Any& v) { s.pal(v); }},
        {"twoPass", [](const Self& s, Any& v) { s.ofVideo("twoPass", v); }},
        {"twoPassPossible", [](const Self& s, Any& v) { s.ofVideo("twoPassPossible", v); }},
        {"enableSetSize", [](const Self& s, Any& v) { s.ofVideo("enableSetSize", v); }},
        {"availableCodecs", [](const Self& s, Any& v) { v = s.preset_.lists(); }},
        {"estimateSecKb", [](const Self& s, Any& v) { s.estimate(v); }},
        {"filename", [](const Self& s, Any& v) { v = s.end_.filename(); }},
        {"filesWritten", [](const Self& s, Any& v) { s.filesWritten(v); }},
        {"extension", [](const Self& s, Any& v) { s.extension(v); }},
        {"muxerName", [](const Self& s, Any& v) { v = s.end_.muxer() ? s.end_.muxer()->name() : "none"; }},
        {"sinkName", [](const Self& s, Any& v) { v = s.end_.sinkName(); }},
        {"videoName", [](const Self& s, Any& v) { v = s.nameOfFirst(qvVideoStream, "videoName"); }},
        {"audioName", [](const Self& s, Any& v) { v = s.nameOfFirst(qvAudioStream, "audioName"); }},
        {"videoAvailable", nullptr, "EncodePipe: 'videoAvailable' parameter OBSOLETE."},
        {"audioAvailable", nullptr, "EncodePipe: 'audioAvailable' parameter OBSOLETE."},
        {"videoNecessary", [](const Self& s, Any& v) { s.videoNecessary(v); }},
        {"bitrateRange", [](const Self& s, Any& v) { s.bitrateRange(v); }},
    };
    for (const auto& row : rows) {
        if (std::strcmp(row.name, name) != 0) continue;
        if (row.obsolete) QV_FAIL(row.obsolete);
        row.get(*this, value);
        return true;
    }
    return false;
}

void OutputAnswers::ofVideo(const char* name, Any& value) const {
    if (const auto* encoder = streams_.encoder(qvVideoStream, 0)) encoder->getParam(name, value);
}

void OutputAnswers::ofMuxer(const char* name, Any& value) const {
    if (const auto* muxer = end_.muxer()) muxer->getParam(name, value);
}

void OutputAnswers::preset(Any& value) const {
    qv_dbg()->warning("EncodePipe: 'preset' parameter DEPRECATED, use QvEncodePipe::activePreset().");
    value = static_cast<const AnyDict&>(preset_.preset());
}

void OutputAnswers::presets(Any& value) const {
    qv_dbg()->warning("EncodePipe: 'presets' parameter DEPRECATED, use QvPresetMgr::builtinPresets()");
    value = static_cast<const AnyVector&>(qvPresetMgr()->builtinPresets());
}

void OutputAnswers::origProfile(Any& value) const {
    qv_dbg()->warning("EncodePipe: 'origProfile' parameter DEPRECATED, use activePreset()->profile()");
    value = preset_.preset().profile();
}

void OutputAnswers::pal(Any& value) const {
    ofVideo("pal", value);
    if (!value.isValid()) ofMuxer("pal", value);
}

// The multiplexer's, else the sum over the encoders.
void OutputAnswers::estimate(Any& value) const {
    ofMuxer("estimateSecKb", value);
    if (value.isValid()) return;
    double sum = 0;
    for (const auto& stream : streams_) {
        if (!stream->encoder) continue;
        const Any part = static_cast<const QvCodec*>(stream->encoder)->getParam("estimateSecKb");
        if (part.isInt() || part.isFloat()) sum += part.toDouble();
    }
    value = sum;
}

void OutputAnswers::filesWritten(Any& value) const {
    ofMuxer("filesWritten", value);
    if (!value.isValid() && end_.sink()) end_.sink()->getParam("filesWritten", value);
    if (!value.isValid()) value = AnyVector();
}

void OutputAnswers::extension(Any& value) const {
    ofMuxer("extension", value);
    if (!value.isValid()) value = "000";
}

void OutputAnswers::srPossible(Any& value) const {
    Any muxer;
    Any encoder;
    ofMuxer("srPossible", muxer);
    ofVideo("srPossible", encoder);
    if (muxer.isFalse())
        qv_dbg()->info("Smart render not possible, not supported by decoder.");
    else if (encoder.isFalse())
        qv_dbg()->info("Smart render not possible, not supported by encoder.");
    value = muxer.isTrue() && encoder.isTrue() ? 1 : 0;
}

void OutputAnswers::videoNecessary(Any& value) const {
    Any needed;
    ofMuxer("videoNecessary", needed);
    if (needed.isFalse()) {
        value = 0;
        return;
    }
    const Any text =
        Any::sprintf("Multiplexer %s requires video stream to be selected", end_.muxer()->displayName());
    value = Any::sprintf("[%s] %s", displayName_, text.asString());
}

void OutputAnswers::bitrateRange(Any& value) const {
    Any answer;
    ofVideo("bitrateRange", answer);
    if (!answer.isVector()) return;
    AnyVector ranges;
    for (const auto& element : answer.asVector()) {
        if (!element.isDict()) continue;
        const AnyDict& entry = element.asDict();
        ranges.append(AnyDict("type", entry.get("type"), "range", entry.get("range")));
    }
    value = ranges;
}

Any OutputAnswers::nameOfFirst(int type, const char* param) const {
    qv_dbg()->warning("EncodePipe: '%s' parameter DEPRECATED, use audioEncoder(...)->name()", param);
    const auto* encoder = streams_.encoder(type, 0);
    return Any(encoder ? encoder->name() : "none");
}
