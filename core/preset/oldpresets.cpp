#include "core/preset/oldpresets_p.h"

#include <algorithm>
#include <cstring>
#include <iterator>
#include <string_view>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/measure/streamtype.h"
#include "core/preset/qvpresetmgr.h"
#include "core/preset/qvprofile.h"

namespace {

struct Renamed {
    std::string_view old;
    const char* today;
};

// clang-format off
constexpr Renamed kRenamed[] = {
    {"dvmux",       "dv100mux"},
    {"mpegtsmux",   "mptsmux"},
    {"dvvenc",      "dv100venc"},
    {"stdvc1venc",  "vc1venc"},
    {"stdh264venc", "h264venc"},
    {"ddaenc",      "ddproaenc"},
};
// clang-format on

constexpr const char* kModuleNames[] = {"video.codec",      "audio.codec",      "mux.codec",
                                        "video.state.name", "audio.state.name", "mux.state.name"};
constexpr const char* kProfiles[] = {"video.state.profile", "audio.state.profile", "mux.state.profile"};

const Any& at(const AnyDict& params, const char* path) {
    const Any* const value = params.descendant("%s", path);
    return value ? *value : Any::invalid();
}

const char* nameAt(const AnyDict& params, const char* path) {
    const Any& name = at(params, path);
    return name.isString() ? name.asString() : nullptr;
}

void renameModules(AnyDict& params) {
    for (const char* path : kModuleNames) {
        Any* const name = params.descendant("%s", path);
        if (name && name->isWString()) *name = name->toString();
        if (!name || !name->isString()) continue;
        const auto* row = std::find_if(std::begin(kRenamed), std::end(kRenamed), [&](const Renamed& one) {
            return one.old == std::string_view(name->asString());
        });
        if (row != std::end(kRenamed)) *name = row->today;
    }
}

int typeOf(const AnyDict& params) {
    for (const char* path : {"video.state.type", "video.state.settingsDict.video_type"})
        if (const Any& type = at(params, path); type.isInt32()) return type.asInt32();
    return 0;
}

// A stored record has its bytes in the file; what the catalogue is asked with points to one.
int profileOf(const AnyDict& params) {
    const Any& stored = at(params, "video.state.settings");
    QvDvSettings settings;
    Any record;
    if (stored.isGeneric() && stored.size() >= static_cast<int>(sizeof settings)) {
        std::memcpy(&settings, stored.asGeneric(), sizeof settings);
        record = Any(&settings, 0);
    }
    return qvProfile2No(params.getInt32("origProfile", QvProfile::notSet), typeOf(params),
                        nameAt(params, "video.codec"), nameAt(params, "mux.codec"),
                        record.isValid() ? &record : nullptr);
}

AnyVector streamsOf(const AnyDict& params) {
    AnyVector streams;
    for (const auto& [path, type] :
         {std::pair("video.state", qvVideoStream), std::pair("audio.state", qvAudioStream)})
        if (const Any& state = at(params, path); state.isDict())
            streams.append(AnyDict("codec", state, "stream", AnyDict(), "type", static_cast<int>(type)));
    return streams;
}

// Adds one preset, or logs why it is skipped.
void import(const std::string& name, AnyDict params, QvLoadedPresets& to) {
    renameModules(params);
    const int old = params.getInt32("origProfile", QvProfile::notSet);
    const int profile = profileOf(params);
    const char* const symbol = qvProfileToSym(qvFixOldProfileNo(old));
    if (profile < 0) {
        qv_dbg()->debug("Skipping preset '%s , base profile %s(%d) not available.", name.c_str(), symbol,
                        old);
        return;
    }
    for (const char* path : kProfiles)
        if (Any* const number = params.descendant("%s", path)) *number = profile;
    QvPreset preset(profile, name.c_str());
    if (!qvPresetMgr()->profileAvailable(profile)) {
        qv_dbg()->warning("Disabled preset '%s', base profile %s (%d) not available.", name.c_str(),
                          qvProfileToSym(profile), profile);
        preset.setDisabled(true);
    }
    const Any& muxer = at(params, "mux.state");
    if (!muxer.isDict()) {
        qv_dbg()->error("Skipping preset '%s', muxer record not present", name.c_str());
        return;
    }
    preset.set("muxer", muxer);
    const AnyVector streams = streamsOf(params);
    if (streams.empty()) {
        qv_dbg()->warning("Skipping preset '%s', no video or audio records found.", name.c_str());
        return;
    }
    preset.set("streams", streams);
    qv_dbg()->info("user preset '%s' 1.6->2.0 convert - switching profile from %s(%d) to %s %d", name.c_str(),
                   symbol, old, qvProfileToSym(profile), profile);
    preset.isValid();
    to.add(std::move(preset));
}

}  // namespace

const char* qvFaultOfOldPreset(const Any& element) {
    return element.isDict() && !element.asDict().get("params").isDict() ? "'params' not defined" : nullptr;
}

int qvImportOldPresets(const AnyVector& user, QvLoadedPresets& to) {
    int result = QvStatus::ok;
    for (const Any& element : user) {
        const Any name = element.isDict() ? element.asDict().get("name").toString() : Any();
        if (!element.isDict()) {
            qv_dbg()->error("Skipping preset, it is no dictionary");
            result = QvStatus::failed;
            continue;
        }
        QV_ASSERT(!qvFaultOfOldPreset(element));
        if (!name.isString()) {
            qv_dbg()->error("Skipping preset, it has no name");
            result = QvStatus::failed;
            continue;
        }
        import(name.asString(), element.asDict().getDict("params"), to);
    }
    return result;
}
