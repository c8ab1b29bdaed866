#include "core/preset/builtincatalogue_p.h"

#include <algorithm>
#include <cstring>
#include <unordered_map>

#include "core/preset/tables/codecpairs_p.h"
#include "core/preset/tables/pluginpresets_p.h"
#include "core/preset/tables/presetcolumns_p.h"
#include "core/preset/tables/presetgroups_p.h"

namespace {

// Groups of plug-ins are numbered from here on.
constexpr int kFirstOwnGroup = 200;

template <class Range>
AnyVector listOf(const Range& names) {
    AnyVector list;
    for (const char* name : names) list.append(Any(name));
    return list;
}

// The name of a group of this library's presets, which need not be installed.
const char* groupOf(int profile) {
    for (const PresetGroupRow& row : qvPresetGroups()) {
        const auto members = row.members();
        if (std::find(members.begin(), members.end(), profile) != members.end()) return row.name;
    }
    return "";
}

// Indexes of the presets by their profiles.
std::unordered_map<int, int> placesOf(const QvPresetList& presets) {
    std::unordered_map<int, int> places;
    for (int i = 0; i < presets.size(); ++i)
        places.emplace(presets.at(i).asDict().getInt32("profile", -1), i);
    return places;
}

void addGroups(BuiltinCatalogue& catalogue) {
    const auto places = placesOf(catalogue.presets);
    for (const PresetGroupRow& row : qvPresetGroups()) {
        AnyVector indexes;
        for (const int profile : row.members())
            if (const auto found = places.find(profile); found != places.end())
                indexes.append(Any(found->second));
        if (!indexes.empty()) catalogue.groups.addToGroup(row.id, row.name, indexes);
    }
}

// The number of a group that a plug-in names, which may be one of this library's.
int groupId(const PresetGroupList& groups, const char* name) {
    if (const int place = groups.findByName(name); place >= 0) return groups[place].id();
    for (const PresetGroupRow& row : qvPresetGroups())
        if (std::strcmp(row.name, name) == 0) return row.id;
    int id = kFirstOwnGroup;
    while (groups.findById(id) >= 0) ++id;
    return id;
}

}  // namespace

AnyVector BuiltinCatalogue::missingPresets() const {
    AnyVector list;
    for (const auto& [family, encoderInstalled] : missing) {
        const AnyVector waitsFor = encoderInstalled ? listOf(qvFamilyMuxers(*family)) : listOf(family->video);
        for (const FamilyMember& member : family->presets())
            list.append(AnyDict("profile", member.profile, "name", member.name, "group",
                                groupOf(member.profile), "waitsFor", waitsFor));
    }
    return list;
}

BuiltinCatalogue BuiltinCatalogue::make() {
    const InstalledModules installed;
    BuiltinCatalogue catalogue;
    catalogue.pairs = qvInstalledPairs(installed);
    qvAddPluginPairs(catalogue.pairs, installed);
    for (const PresetFamily& family : qvPresetFamilies()) {
        const PresetColumns columns = qvPresetColumns(family, installed, catalogue.pairs);
        if (!columns.complete())
            catalogue.missing.push_back({&family, !columns.video.empty()});
        else
            for (const FamilyMember& member : family.presets())
                catalogue.presets.append(
                    QvPreset(member.profile, member.name, columns.video, columns.audio, columns.muxers));
    }
    addGroups(catalogue);
    for (const PluginPreset& own : qvPluginPresets(catalogue.presets, catalogue.pairs, installed)) {
        const AnyVector index{Any(catalogue.presets.size())};
        catalogue.presets.append(QvPreset(own.profile, own.name.c_str(), own.video, own.audio, own.muxers));
        catalogue.groups.addToGroup(groupId(catalogue.groups, own.group.c_str()), own.group.c_str(), index);
    }
    return catalogue;
}
