// Exchanging the multiplexer and the sink.
#include <cstring>

#include "builtin/pipes/encodepipe2.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvregistry.h"
#include "core/job/filtersstate.h"

namespace {

bool is(const char* name, const char* other) { return std::strcmp(name, other) == 0; }

// The sink that goes with a multiplexer of the engine's own use, or null.
const char* companionSink(const char* muxer) {
    if (is(muxer, "nullmux")) return "nullsink";
    return is(muxer, "memmux") ? "memsink" : nullptr;
}

}  // namespace

int EncodePipe2::setMuxer(const char* name) {
    QV_ASSERT(name);
    if (const int result = refuseWhileOpen()) return result;
    const int result = _setMuxer(name, false);
    if (adjustCodecToMuxer_) adjustForTransport();
    return result;
}

int EncodePipe2::_setMuxer(const char* name, bool changingPreset) {
    if (const char* sinkName = companionSink(name)) return setInternalMuxer(name, sinkName);
    if (changingPreset) {
        QV_ASSERT(getState() != qvStateOpen);
        QV_ASSERT_MSG(streams_.empty(), "EncodePipe._setMuxer: streams not removed while changingPreset");
    }
    if (!qv_registry()->module(name))
        return setError(QvStatus::failed, "setMuxer: muxer '%s' not available", name);
    if (!preset_.muxerAllowed(name))
        return setError(QvStatus::failed, "setMuxer: '%s' not allowed in current preset", name);
    auto fresh = newMuxer(name);
    if (!fresh) {
        setError(QvStatus::failed, "setMuxer: muxer '%s' not loaded", name);
        QV_FAIL(errorDesc());
    }
    return replaceMuxer(std::move(fresh), changingPreset);
}

int EncodePipe2::replaceMuxer(std::unique_ptr<QvMuxer> fresh, bool changingPreset) {
    AnyVector former;
    AnyVector formerPrograms;
    Any type;
    Any pal;
    Any dropFrame;
    const bool wasInternal = muxer_ && companionSink(muxer_->name());
    if (muxer_ && !changingPreset) {
        former = describeForRebuild();
        formerPrograms = storePrograms();
        AnyDict settings;
        muxer_->store(settings);
        saved_.set(muxer_->name(), settings);
        muxer_->getParam("type", type);
        muxer_->getParam("pal", pal);
        muxer_->getParam("dropFrameTC", dropFrame);
        removeStreams(qvAllStreams);
    }
    dropMuxer();
    if (wasInternal)
        if (const int result = setSink("filesink")) return result;
    muxer_ = std::move(fresh);
    forwardToMuxer("profile", preset_.profile());
    if (type.isValid()) forwardToMuxer("type", type);
    if (pal.isValid()) forwardToMuxer("pal", pal);
    restoreMuxerSettings(*muxer_);
    if (sink_) muxer_->attachOutStream(sink_->stream());
    rebuildAllowed();
    if (!changingPreset) rebuildStreams(former, formerPrograms);
    if (pal.isValid()) {
        forwardToMuxer("pal", pal);
        forwardToEncoders(qvAllStreams, "pal", pal);
    }
    if (dropFrame.isValid()) {
        forwardToMuxer("dropFrameTC", dropFrame);
        forwardToEncoders(qvAllStreams, "dropFrameTC", dropFrame);
    }
    if (filename_.isValid()) {
        if (sink_) forward(sink_.get(), "filename", filename_);
        forwardToMuxer("filename", filename_);
    }
    return QvStatus::ok;
}

// What this pipe had set on a multiplexer of that name before, else what the user's preset holds for it.
void EncodePipe2::restoreMuxerSettings(QvMuxer& fresh) {
    const auto& before = saved_.get(fresh.name());
    if (before.isDict()) {
        fresh.restore(before.asDict());
        return;
    }
    if (!preset_.isCustom()) return;
    const AnyDict stored = preset_.muxerParams();
    if (stored.empty()) return;
    if (!(stored.get("name") == fresh.name())) {
        setError(QvStatus::failed, "_setMuxer - stored muxer parameters don't match current muxer '%s'?",
                 fresh.name());
        QV_FAIL(errorDesc());
    }
    fresh.restore(stored);
}

int EncodePipe2::setInternalMuxer(const char* name, const char* sinkName) {
    QV_ASSERT_MSG(streams_.empty(), "Only allowed for multipass, there must be no streams");
    auto fresh = newMuxer(name);
    if (!fresh) return setError(QvStatus::failed, "setMuxer: unknown muxer '%s'", name);
    dropMuxer();
    if (const int result = setSink(sinkName)) return result;
    muxer_ = std::move(fresh);
    muxer_->attachOutStream(sink_->stream());
    rebuildAllowed();
    return QvStatus::ok;
}

void EncodePipe2::dropMuxer() {
    if (muxer_) muxer_->detachOutStream();
    muxer_.reset();
}

std::unique_ptr<QvMuxer> EncodePipe2::newMuxer(const char* name) const {
    std::unique_ptr<QvCodec> codec(qv_registry()->newCodec(name));
    if (!codec || !codec->getInterface(QvModuleType::muxer)) return nullptr;
    return std::unique_ptr<QvMuxer>(static_cast<QvMuxer*>(codec.release()));
}

int EncodePipe2::setSink(const char* name) {
    QV_ASSERT(name && *name);
    if (const int result = refuseWhileOpen()) return result;
    std::unique_ptr<QvCodec> fresh(qv_registry()->newCodec(name));
    if (!fresh || !fresh->getInterface(QvModuleType::sink))
        return setError(QvStatus::failed, "[EncodePipe2] setSink: Invalid module %s", name);
    if (muxer_) muxer_->detachOutStream();
    sink_.reset(static_cast<QvSink*>(fresh.release()));
    sinkName_ = name;
    if (filename_.isValid()) forward(sink_.get(), "filename", filename_);
    if (muxer_) muxer_->attachOutStream(sink_->stream());
    return QvStatus::ok;
}

void EncodePipe2::rebuildAllowed() {
    allowed_.clear();
    allowed_.set("muxers", preset_.muxers());
    const bool all = takesAllCodecs();
    const char* muxer = muxer_ ? muxer_->name() : "";
    for (const int kind : {QvModuleType::videoEncoder, QvModuleType::audioEncoder})
        allowed_.set(kind == QvModuleType::videoEncoder ? "vcodecs" : "acodecs",
                     all ? preset_.codecs(kind) : preset_.getCompatible(muxer, kind));
}

bool EncodePipe2::hasTransportMuxer() const {
    return muxer_ && (is(muxer_->name(), "mptsmux") || is(muxer_->name(), "mpegtsmux"));
}

void EncodePipe2::adjustForTransport() {
    if (hasTransportMuxer()) forwardToEncoders(qvVideoStream, "tsAdjust", 1);
}

// One dictionary a stream: "type", "codec" and "stream" as they are stored, "filters", "enabled".
AnyVector EncodePipe2::describeForRebuild() const {
    AnyVector former;
    for (const auto& stream : streams_) {
        AnyDict entry = storeStream(*stream);
        entry.set("enabled", stream->enabled() ? 1 : 0);
        former.append(entry);
    }
    return former;
}

// A stream keeps its encoder with its settings where the new multiplexer takes it.
void EncodePipe2::rebuildStreams(const AnyVector& former, const AnyVector& formerPrograms) {
    if (programsSupported() && !formerPrograms.empty()) addPrograms(formerPrograms);
    for (const auto& element : former) {
        const AnyDict& entry = element.asDict();
        const int type = entry.getInt32("type");
        AnyDict request;
        if (type != qvSubpicStream) {
            const auto& allowed = allowedCodecs(type);
            const Any& codec = entry.get("codec");
            if (allowed.empty()) {
                qv_dbg()->warning(
                    "EncodePipe._setMuxer: skipped stream - no compatible %s codec found for %s",
                    qvStreamTypeName(type), muxer_->name());
                continue;
            }
            const bool kept = allowed.contains(codec.asDict().get("name"));
            request.set("codec", kept ? codec : allowed.front());
        }
        if (entry.get("stream").isDict()) request.set("stream", entry.get("stream"));
        const int nr = addStream(type, request);
        if (nr < 0) {
            qv_dbg()->warning("EncodePipe._setMuxer: skipped stream - %s", errorDesc());
            continue;
        }
        auto* added = find(type, nr);
        if (entry.get("filters").isDict()) added->filters() = FiltersState(entry.get("filters").asDict());
        added->setEnabled(entry.getInt32("enabled", 1) != 0);
    }
}
