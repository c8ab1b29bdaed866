#include "builtin/pipes/output/muxerexchange.h"

#include "builtin/pipes/output/members/pipehost.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"

int MuxerExchange::change(const char* module) { return put(module, true); }

int MuxerExchange::start(const char* module) { return put(module, false); }

int MuxerExchange::put(const char* module, bool keepStreams) {
    const auto traits = MuxerTraits::of(module, qv_registry()->module(module));
    if (!traits.companionSink.empty()) return putInternal(module, traits.companionSink.c_str());
    QV_ASSERT_MSG(keepStreams || streams_.empty(),
                  "EncodePipe._setMuxer: streams not removed while changingPreset");
    if (!qv_registry()->module(module))
        return host_.fail(QvStatus::failed, "setMuxer: muxer '%s' not available", module);
    if (!preset_.preset().muxerAllowed(module))
        return host_.fail(QvStatus::failed, "setMuxer: '%s' not allowed in current preset", module);
    auto fresh = MuxerPlace::newMuxer(module);
    if (!fresh) {
        host_.fail(QvStatus::failed, "setMuxer: muxer '%s' not loaded", module);
        QV_FAIL(host_.lastFailure());
    }
    return replace(std::move(fresh), keepStreams);
}

int MuxerExchange::putInternal(const char* module, const char* sink) {
    QV_ASSERT_MSG(streams_.empty(), "Only allowed for multipass, there must be no streams");
    auto fresh = MuxerPlace::newMuxer(module);
    if (!fresh) return host_.fail(QvStatus::failed, "setMuxer: unknown muxer '%s'", module);
    end_.drop();
    if (const int result = end_.setSink(sink)) return result;
    end_.put(std::move(fresh));
    end_.attach();
    preset_.follow(end_.muxer());
    return QvStatus::ok;
}

int MuxerExchange::replace(std::unique_ptr<QvMuxer> fresh, bool keepStreams) {
    std::vector<StreamSnapshot> former;
    std::vector<QvProgram> programs;
    MuxerPlace::Handover carried;
    const bool wasInternal = !end_.traits().companionSink.empty();
    if (end_.muxer() && keepStreams) {
        former = StreamSnapshot::all(streams_, end_.muxer());
        programs = end_.programs().all();
        carried = end_.handOver();
        builder_.removeAll(qvAllStreams);
    }
    end_.drop();
    if (wasInternal)
        if (const int result = end_.setSink("filesink")) return result;
    end_.put(std::move(fresh));
    end_.offer("profile", preset_.preset().profile());
    if (carried.type.isValid()) end_.offer("type", carried.type);
    if (carried.pal.isValid()) end_.offer("pal", carried.pal);
    end_.restoreSettings(preset_.preset());
    end_.attach();
    preset_.follow(end_.muxer());
    if (keepStreams) rebuild(former, programs);
    if (carried.pal.isValid()) {
        end_.offer("pal", carried.pal);
        streams_.offer(qvAllStreams, "pal", carried.pal);
    }
    if (carried.dropFrame.isValid()) {
        end_.offer("dropFrameTC", carried.dropFrame);
        streams_.offer(qvAllStreams, "dropFrameTC", carried.dropFrame);
    }
    end_.repeatFilename();
    return QvStatus::ok;
}

// A stream keeps its encoder with its settings where the new multiplexer takes it.
void MuxerExchange::rebuild(const std::vector<StreamSnapshot>& former,
                            const std::vector<QvProgram>& programs) {
    if (end_.hasPrograms() && !programs.empty()) end_.programs().addAll(programs, host_);
    for (const auto& shot : former) {
        StreamRequest request;
        request.params = shot.params;
        if (shot.type != qvSubpicStream) {
            const auto& allowed = preset_.codecs(shot.type);
            if (allowed.empty()) {
                qv_dbg()->warning(
                    "EncodePipe._setMuxer: skipped stream - no compatible %s codec found for %s",
                    qvStreamTypeName(shot.type), end_.muxer()->name());
                continue;
            }
            const bool kept = allowed.contains(Any(shot.codec.c_str()));
            request.codec = kept ? shot.codec : allowed.front().toString().asString("");
            if (kept) request.settings = shot.settings;
        }
        const int nr = builder_.add(shot.type, std::move(request));
        if (nr < 0) {
            qv_dbg()->warning("EncodePipe._setMuxer: skipped stream - %s", host_.lastFailure());
            continue;
        }
        auto* added = streams_.find(shot.type, nr);
        added->filters() = shot.filters;
        added->setEnabled(shot.enabled);
    }
}
