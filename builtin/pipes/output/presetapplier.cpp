#include "builtin/pipes/output/presetapplier.h"

#include <string_view>

#include "builtin/pipes/output/members/pipehost.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"

namespace {

// DVCPRO HD has an encoder and a multiplexer of its own, in whatever container.
bool isDv100(int profile) {
    return std::string_view(qvProfileToSym(profile)).find("DVCPRO100") != std::string_view::npos;
}

}  // namespace

int PresetApplier::applyBuiltin(int profile, bool keepFilters) {
    const int index = qvPresetMgr()->findByProfile(profile);
    if (index < 0) return host_.fail(QvStatus::invalidStructure, "Invalid preset #%d", profile);
    const QvPreset preset = qvPresetMgr()->builtinPreset(index);
    qv_dbg()->info("[Encode Pipe] Applying built-in preset %s(%d), nr=%d", preset.name(), preset.profile(),
                   index);
    const auto former = StreamSnapshot::all(streams_, end_.muxer());
    builder_.removeAll(qvAllStreams);
    preset_.set(preset);
    if (const int result = build(preset, former)) return result;
    if (keepFilters) giveFilters(former);
    builder_.adjustForTransport();
    return QvStatus::ok;
}

int PresetApplier::build(const QvPreset& preset, const std::vector<StreamSnapshot>& former) {
    const bool dv100 =
        isDv100(preset.profile()) && qv_registry()->module("dv100mux") && preset.muxerAllowed("dv100mux");
    if (const int result = startMuxer(preset, dv100 ? "dv100mux" : nullptr)) return result;
    if (const int result = addDefaultStreams(preset)) return result;
    for (const auto& shot : former)
        if (shot.type == qvSubpicStream && builder_.room(qvSubpicStream) > 0)
            builder_.addDefault(qvSubpicStream);
    return QvStatus::ok;
}

// The preset's multiplexer, or the preferred one, with the preset's programs.
int PresetApplier::startMuxer(const QvPreset& preset, const char* preferred) {
    const Any muxer = preferred ? Any(preferred) : preset.defaultMuxer();
    if (!muxer.isString())
        return host_.fail(QvStatus::failed, "Preset '%s' has no multiplexer that is installed",
                          preset.name());
    if (const int result = exchange_.start(muxer.asString())) return result;
    if (!end_.hasPrograms()) return QvStatus::ok;
    return end_.programs().addAll(ProgramList::fromState(preset.programs()), host_);
}

int PresetApplier::addDefaultStreams(const QvPreset& preset) {
    for (const int type : {qvVideoStream, qvAudioStream}) {
        const auto& allowed = preset_.codecs(type);
        if (allowed.empty() || builder_.room(type) < 1) continue;
        StreamRequest request;
        if (type == qvVideoStream && isDv100(preset.profile()) && allowed.contains(Any("dv100venc")))
            request.codec = "dv100venc";
        if (const int nr = builder_.add(type, std::move(request)); nr < 0) return nr;
    }
    return QvStatus::ok;
}

// To the streams of the same type and number.
void PresetApplier::giveFilters(const std::vector<StreamSnapshot>& former) {
    int numbers[qvSubpicStream + 1] = {};
    for (const auto& shot : former) {
        auto* stream = streams_.find(shot.type, numbers[shot.type]++);
        if (stream && !shot.filters.empty()) stream->filters() = shot.filters;
    }
}

int PresetApplier::apply(const QvPreset& given, bool keepFilters, const char* module) {
    if (given.isBuiltin()) return applyBuiltin(given.profile(), keepFilters);
    const QvPreset preset = given;  // may be the active one
    qv_dbg()->info("Applying custom preset '%s'.", preset.name());
    const int base = qvPresetMgr()->findByProfile(preset.profile());
    if (base < 0)
        return host_.fail(QvStatus::invalidStructure,
                          "Cannot apply preset '%s', base profile %s (%d) not loaded.", preset.name(),
                          qvProfileToSym(preset.profile()), preset.profile());
    const auto former = StreamSnapshot::all(streams_, end_.muxer());
    builder_.removeAll(qvAllStreams);
    const Any& streams = preset.get("streams");  // a dictionary in an older form, see PipeState
    const bool whole = preset.get("muxer").isDict() && (streams.isVector() || streams.isDict());
    if (whole) {
        if (const int result = restoreWhole(preset, module)) return result;
        if (keepFilters) giveFilters(former);
        return QvStatus::ok;
    }
    const int result = applyLoose(preset);
    if (keepFilters) giveFilters(former);
    return result;
}

// A user's preset that holds a whole state.
int PresetApplier::restoreWhole(const QvPreset& preset, const char* module) {
    AnyDict state = preset;
    state.set("name", module);
    state.set("__class__", "EncodePipe");
    if (const int result = state_.restore(state, module)) return result;
    preset_.set(preset);
    preset_.follow(end_.muxer());
    return QvStatus::ok;
}

// A user's preset that does not.
int PresetApplier::applyLoose(const QvPreset& preset) {
    preset_.set(preset);
    const int result = startMuxer(preset, nullptr);
    return result != QvStatus::ok ? result : addPresetStreams(preset);
}

int PresetApplier::addPresetStreams(const QvPreset& preset) {
    std::vector<int> types;
    for (const auto& entry : preset.getVector("streams"))
        if (entry.isDict()) types.push_back(entry.asDict().getInt32("type", -1));
    if (types.empty()) {
        types = {qvVideoStream, qvAudioStream};
        // As of a built-in preset.
        std::erase_if(types, [this](int type) { return preset_.codecs(type).empty(); });
    }
    int over = 0;
    int failed = 0;
    for (const int type : types) {
        const bool known = type == qvVideoStream || type == qvAudioStream || type == qvSubpicStream;
        const int nr = known ? streams_.count(type) : -1;
        if (known && builder_.room(type) < 1) {
            ++over;
            qv_dbg()->warning("[EncodePipe] Apply preset: not adding %s#%d due to muxer/preset limitation",
                              qvStreamTypeName(type), nr);
        } else if (!known || builder_.addDefault(type) < 0) {
            ++failed;
            qv_dbg()->error("[EncodePipe] Apply preset: failed to add %s#%d", qvStreamTypeName(type), nr);
        }
    }
    if (failed > 0)
        return host_.fail(QvStatus::failed, "Preset '%s' applied with errors, failed to add some streams.",
                          preset.name());
    if (over > 0)
        qv_dbg()->warning("Preset '%s' applied, %d streams not added due to preset/muxer limitation",
                          preset.name(), over);
    return QvStatus::ok;
}
