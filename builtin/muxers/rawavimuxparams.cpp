// Parameters of the AVI multiplexer.
#include "builtin/muxers/rawavimux.h"
#include "builtin/muxers/streamcodec.h"
#include "core/arch/qvassert.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvregistry.h"
#include "core/measure/qvgeometry.h"
#include "core/preset/qvpresetmgr.h"

struct RawAviMuxParams {
    using Mux = RawAviMux;
    using Access = QvParamAccess<Mux>;

    static std::span<const QvParamRow<Mux>> rows() {
        using M = const Mux&;
        static const QvParamRow<Mux> table[] = {
            {"riffBytes", &Mux::riffBytes_, qvParamStored, 1024, 1 << 30, "", "bytes",
             "of each RIFF part of the file"},
            {"segments", &Mux::segments_, qvParamStored, 1, 65536, "", "", "RIFF parts at most"},
            {"framerate", {}, qvParamIgnored},
            {"estimateSecKb", Access{nullptr, [](M m, Any& v) { v = qvEstimateSecKb(m); }}},
            {"videoCodecs", Access{nullptr, [](M m, Any& v) { v = qvMuxerCodecs(m, 7); }}},
            {"audioCodecs", Access{nullptr, [](M m, Any& v) { v = qvMuxerCodecs(m, 6); }}},
            {"extension", Access{nullptr, [](M, Any& v) { v = "avi"; }}},
            {"maxStreams",
             Access{nullptr, [](M, Any& v) { v = AnyDict("vids", 99, "auds", 99, "subs", 0, "total", 99); }}},
        };
        return table;
    }
};

int RawAviMux::setParam(const char* name, const Any& value) {
    QV_ASSERT_MSG(getState() != qvStateOpen, "[rawavimux] Invalid state");
    _traceParam(name, value);
    if (auto result = qvSetParamRow(RawAviMuxParams::rows(), *this, name, value)) return *result;
    return BaseMuxer::setParam(name, value);
}

void RawAviMux::getParam(const char* name, Any& value) const {
    if (!qvGetParamRow(RawAviMuxParams::rows(), *this, name, value)) BaseMuxer::getParam(name, value);
}

void RawAviMux::store(AnyDict& state) const {
    state.clear();
    state.set("name", name());
    qvStoreParamRows(RawAviMuxParams::rows(), *this, state);
}

int RawAviMux::restore(const AnyDict& state) {
    if (!(state.get("name") == name())) return setError(QvStatus::failed, "restore - invalid name");
    return _restoreRows(RawAviMuxParams::rows(), *this, state);
}
