#include "core/preset/presetgroup.h"

#include <algorithm>

#include "core/arch/qvassert.h"

int PresetGroup::preset(int i) const {
    QV_ASSERT(i >= 0 && i < size());
    return presets_[static_cast<std::size_t>(i)];
}

bool PresetGroup::holds(int index) const {
    return std::find(presets_.begin(), presets_.end(), index) != presets_.end();
}

void PresetGroup::update(const AnyVector& indexes) {
    const bool valid = std::all_of(indexes.begin(), indexes.end(), [](const Any& i) { return i.isInt32(); });
    QV_ASSERT_MSG(valid, "PresetGroup.update: invalid data type");
    for (const Any& index : indexes) presets_.push_back(index.asInt32());
}

const PresetGroup& PresetGroupList::at(int i) const {
    QV_ASSERT(i >= 0 && i < size());
    return groups_[static_cast<std::size_t>(i)];
}

template <class Match>
int PresetGroupList::find(int from, Match match) const {
    const auto first = groups_.begin() + std::clamp(from, 0, size());
    const auto found = std::find_if(first, groups_.end(), match);
    return found == groups_.end() ? -1 : static_cast<int>(found - groups_.begin());
}

int PresetGroupList::findById(int id) const {
    return find(0, [id](const PresetGroup& group) { return group.id() == id; });
}

int PresetGroupList::findByName(const char* name) const {
    const std::string wanted = name ? name : "";
    return find(0, [&](const PresetGroup& group) { return group.name() == wanted; });
}

int PresetGroupList::findByPresetIndex(int index, int from) const {
    return find(from, [index](const PresetGroup& group) { return group.holds(index); });
}

int PresetGroupList::findByPresetProfile(const QvPresetList& presets, int profile, int from) const {
    const int index = presets.indexOfProfile(profile);
    QV_ASSERT_MSG(index >= 0, "container doesn't contain profile");
    return findByPresetIndex(index, from);
}

int PresetGroupList::findByPresetName(const QvPresetList& presets, const char* name, int from) const {
    const int index = presets.indexOfName(name);
    QV_ASSERT_MSG(index >= 0, "container doesn't contain name");
    return findByPresetIndex(index, from);
}

void PresetGroupList::addToGroup(int id, const char* name, const AnyVector& indexes) {
    const int place = findById(id);
    if (place >= 0) return groups_[static_cast<std::size_t>(place)].update(indexes);
    QV_ASSERT_MSG(findByName(name) < 0, "addToGroup: groupName already taken");
    PresetGroup group(id, name);
    group.update(indexes);
    groups_.push_back(std::move(group));
}
