#include "core/preset/extendedpresets_p.h"

#include "core/engine/log/qvlog.h"
#include "core/preset/qvprofile.h"

namespace {

// The group that a preset prefers, if there is such a group, else that of its base; -1 for none.
int groupFor(const PresetGroupList& groups, const QvPreset& preset, int base) {
    if (const auto meta = preset.presetMeta(); meta && meta->preferredGroup())
        if (const int place = groups.findByName(meta->preferredGroup()); place >= 0) return place;
    return groups.findByPresetIndex(base);
}

}  // namespace

ExtendedPresets ExtendedPresets::make(const BuiltinCatalogue& builtin, const QvPresetList& source) {
    ExtendedPresets all{builtin.presets, builtin.groups};
    for (int i = 0; i < source.size(); ++i) {
        const QvPreset preset = source.preset(i);
        if (preset.profile() < 0) continue;
        const int base = builtin.presets.indexOfProfile(qvFixOldProfileNo(preset.profile()));
        if (base < 0) {
            qv_dbg()->warning("Skipped extended preset '%s', base profile not available.", preset.name());
            continue;
        }
        if (builtin.presets.indexOfName(preset.name()) >= 0) {
            qv_dbg()->warning("Skipped extended preset '%s', name conflict", preset.name());
            continue;
        }
        const int place = groupFor(all.groups, preset, base);
        if (place < 0) continue;
        const PresetGroup& group = all.groups[place];
        all.groups.addToGroup(group.id(), group.name(), AnyVector(Any(all.presets.size())));
        all.presets.append(preset);
    }
    return all;
}
