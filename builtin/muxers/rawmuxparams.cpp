// Parameters of the elementary stream export.
#include "builtin/muxers/rawmux.h"
#include "builtin/muxers/streamcodec.h"
#include "core/arch/qvassert.h"
#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"

struct RawMuxParams {
    using Mux = RawMux;
    using Access = QvParamAccess<Mux>;

    static Any extension(const Mux& mux) {
        if (mux.nrStreams(qvVideoStream) > 0) return qvStreamExtension(*mux.stream(qvVideoStream, 0), "vid");
        if (mux.nrStreams(qvAudioStream) > 0) return "aud";
        return "vid";
    }
    static Any filenames(const Mux& mux) {
        AnyVector names;
        for (const int type : {qvVideoStream, qvAudioStream})
            for (int nr = 0; nr < mux.nrStreams(type); ++nr) names.append(mux.outputName(type, nr));
        return names;
    }
    static std::span<const QvParamRow<Mux>> rows() {
        using M = const Mux&;
        static const QvParamRow<Mux> table[] = {
            {.name = "rawAsPng",
             .member = &Mux::rawAsPng_,
             .flags = qvParamStored,
             .help = "with splitVideo: frames become PNG files"},
            {.name = "splitVideo",
             .member = &Mux::splitVideo_,
             .flags = qvParamStored,
             .help = "a file for each frame"},
            {.name = "splitAudio",
             .member = &Mux::splitAudio_,
             .flags = qvParamStored,
             .help = "a file for each channel"},
            {.name = "filename",
             .member = &Mux::filename_,
             .help = "of the outputs, without their extensions",
             .type = Any::String},
            {.name = "exactName",
             .member = &Mux::exactName_,
             .help = "the one stream goes to filename as it is"},
            {"type", {}, qvParamIgnored},
            {"_totalFrames", &Mux::totalFrames_},
            {"rawMux", Access{nullptr, [](M, Any& v) { v = 1; }}},
            {"estimateSecKb", Access{nullptr, [](M m, Any& v) { v = qvEstimateSecKb(m); }}},
            {"videoCodecs", Access{nullptr, [](M m, Any& v) { v = qvMuxerCodecs(m, 7); }}},
            {"audioCodecs", Access{nullptr, [](M m, Any& v) { v = qvMuxerCodecs(m, 6); }}},
            {"extension", Access{nullptr, [](M m, Any& v) { v = extension(m); }}},
            {"filenames", Access{nullptr, [](M m, Any& v) { v = filenames(m); }}},
            {"filesWritten", Access{nullptr, [](M m, Any& v) { v = m.filesWritten(); }}},
            {"maxStreams",
             Access{nullptr, [](M, Any& v) { v = AnyDict("vids", 99, "auds", 99, "subs", 0, "total", 99); }}},
        };
        return table;
    }
};

int RawMux::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != qvStateOpen, "[RawMux] Invalid state");
    if (auto result = _setRow(RawMuxParams::rows(), *this, name, value)) return *result;
    return OwnFilesMuxer::setParam(name, value);
}

void RawMux::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow(RawMuxParams::rows(), *this, name, value)) OwnFilesMuxer::getParam(name, value);
}

void RawMux::store(AnyDict& state) const {
    state.clear();
    state.set("name", name());
    qvStoreParamRows(RawMuxParams::rows(), *this, state);
}

int RawMux::restore(const AnyDict& state) {
    if (!(state.get("name") == name())) return setError(QvStatus::failed, "restore - invalid name");
    return _restoreRows(RawMuxParams::rows(), *this, state);
}
