// Making the pipe follow a preset.
#include <algorithm>
#include <vector>

#include "builtin/pipes/encodepipe2.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/params.h"
#include "core/engine/modules/qvregistry.h"
#include "core/job/filtersstate.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"

namespace {

bool isDv100(int profile) {
    constexpr const char* symbols[] = {"DVCPRO100_720p", "DVCPRO100_720p_NATIVE", "DVCPRO100_1080i"};
    return std::any_of(std::begin(symbols), std::end(symbols),
                       [profile](const char* symbol) { return qvSymToProfile(symbol) == profile; });
}

}  // namespace

int EncodePipe2::applyPreset(int profile, int keep) {
    if (const int result = refuseWhileOpen()) return result;
    const int index = qvPresetMgr()->findByProfile(profile);
    if (index < 0) return setError(QvStatus::invalidStructure, "Invalid preset #%d", profile);
    return applyBuiltin(index, keep);
}

int EncodePipe2::applyBuiltin(int index, int keep) {
    const QvPreset preset = qvPresetMgr()->builtinPreset(index);
    qv_dbg()->info("[Encode Pipe] Applying built-in preset %s(%d), nr=%d", preset.name(), preset.profile(),
                   index);
    const AnyVector former = describeForRebuild();
    removeStreams(qvAllStreams);
    preset_ = preset;
    Any muxer = preset.defaultMuxer();
    if (isDv100(preset.profile()) && qv_registry()->module("dv100mux") && preset.muxerAllowed("dv100mux"))
        muxer = "dv100mux";
    if (!muxer.isString())
        return setError(QvStatus::failed, "Preset '%s' has no multiplexer that is installed", preset.name());
    if (const int result = _setMuxer(muxer.asString(), true)) return result;
    if (programsSupported())
        if (const int result = addPrograms(preset.programs())) return result;
    if (const int result = addDefaultStreams(preset)) return result;
    for (const auto& entry : former) {
        const int type = entry.asDict().getInt32("type");
        if (type == qvSubpicStream && canAddStreams(qvSubpicStream) > 0) addSubpicStream(Any());
    }
    if (keep != 0) giveFilters(former);
    adjustForTransport();
    return QvStatus::ok;
}

int EncodePipe2::addDefaultStreams(const QvPreset& preset) {
    for (const int type : {qvVideoStream, qvAudioStream}) {
        if (allowedCodecs(type).empty() || canAddStreams(type) < 1) continue;
        const bool dv100 = type == qvVideoStream && isDv100(preset.profile()) &&
                           allowedCodecs(type).contains(Any("dv100venc"));
        if (const int nr = addStream(type, dv100 ? Any("dv100venc") : Any()); nr < 0) return nr;
    }
    return QvStatus::ok;
}

// To the streams of the same type and number.
void EncodePipe2::giveFilters(const AnyVector& former) {
    int numbers[qvSubpicStream + 1] = {};
    for (const auto& element : former) {
        const AnyDict& entry = element.asDict();
        const int type = entry.getInt32("type");
        auto* stream = find(type, numbers[type]++);
        if (stream && entry.get("filters").isDict())
            stream->filters() = FiltersState(entry.get("filters").asDict());
    }
}

int EncodePipe2::applyPreset(const QvPreset& given, int keep) {
    if (const int result = refuseWhileOpen()) return result;
    if (given.isBuiltin()) return applyPreset(given.profile(), keep);
    const QvPreset preset = given;  // may be the active one
    qv_dbg()->info("Applying custom preset '%s'.", preset.name());
    const int base = qvPresetMgr()->findByProfile(preset.profile());
    if (base < 0)
        return setError(QvStatus::invalidStructure,
                        "Cannot apply preset '%s', base profile %s (%d) not loaded.", preset.name(),
                        qvProfileToSym(preset.profile()), preset.profile());
    const AnyVector former = describeForRebuild();
    removeStreams(qvAllStreams);
    int result = QvStatus::ok;
    if (preset.get("muxer").isDict() && preset.get("streams").isVector()) {
        AnyDict state = preset;
        state.set("name", name());
        state.set("__class__", "EncodePipe");
        result = restore(state);
        if (result != QvStatus::ok) return result;
        preset_ = preset;
        rebuildAllowed();
    } else {
        result = applyLoosePreset(preset);
    }
    if (keep != 0) giveFilters(former);
    return result;
}

// A user's preset that does not hold a whole state.
int EncodePipe2::applyLoosePreset(const QvPreset& preset) {
    preset_ = preset;
    const Any muxer = preset.defaultMuxer();
    if (!muxer.isString())
        return setError(QvStatus::failed, "Preset '%s' has no multiplexer that is installed", preset.name());
    if (const int result = _setMuxer(muxer.asString(), true)) return result;
    if (programsSupported())
        if (const int result = addPrograms(preset.programs())) return result;
    return addPresetStreams(preset);
}

int EncodePipe2::addPresetStreams(const QvPreset& preset) {
    std::vector<int> types;
    for (const auto& entry : preset.getVector("streams"))
        if (entry.isDict()) types.push_back(entry.asDict().getInt32("type", -1));
    if (types.empty()) types = {qvVideoStream, qvAudioStream};
    int over = 0;
    int failed = 0;
    for (const int type : types) {
        const int nr =
            type == qvVideoStream || type == qvAudioStream || type == qvSubpicStream ? nrStreams(type) : -1;
        if (nr >= 0 && canAddStreams(type) < 1) {
            ++over;
            qv_dbg()->warning("[EncodePipe] Apply preset: not adding %s#%d due to muxer/preset limitation",
                              qvStreamTypeName(type), nr);
        } else if (nr < 0 || addStream(type, Any()) < 0) {
            ++failed;
            qv_dbg()->error("[EncodePipe] Apply preset: failed to add %s#%d", qvStreamTypeName(type), nr);
        }
    }
    if (failed > 0)
        return setError(QvStatus::failed, "Preset '%s' applied with errors, failed to add some streams.",
                        preset.name());
    if (over > 0)
        qv_dbg()->warning("Preset '%s' applied, %d streams not added due to preset/muxer limitation",
                          preset.name(), over);
    return QvStatus::ok;
}

int EncodePipe2::addPrograms(const AnyVector& programs) {
    auto* setup = this->programs();
    if (!setup) return QvStatus::ok;
    for (const auto& element : programs) {
        if (!element.isDict()) continue;
        const AnyDict& entry = element.asDict();
        const QvProgram program{entry.getInt32("program_number"), entry.getInt32("program_PID"),
                                entry.getInt32("PCR_PID")};
        if (setup->addProgram(program) < 0)
            return setError(QvStatus::failed, "EncodePipe.restore: failed to add program");
    }
    return QvStatus::ok;
}
