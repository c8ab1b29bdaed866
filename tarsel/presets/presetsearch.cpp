#include "tarsel/presets/presetsearch.h"

#include <algorithm>
#include <optional>

#include "tarsel/presets/presetstore.h"
#include "tarsel/presets/presetwords.h"
#include "tarsel/words/messages.h"

namespace {

// Names and symbols of presets; a row without a preset is missing here.
struct Known {
    std::string name, symbol;
    std::optional<QvPreset> preset;
    std::string waitsFor;
};

std::vector<Known> ownNames(const QvUserPresets& presets) {
    std::vector<Known> all;
    for (int i = 0; i < presets.count(); ++i) all.push_back({presets.at(i).name(), "", presets.at(i), ""});
    return all;
}

std::vector<Known> builtinNames() {
    std::vector<Known> all;
    const QvPresetList& builtin = qvPresetMgr()->builtinPresets();
    for (int i = 0; i < builtin.size(); ++i) {
        const QvPreset preset = builtin.preset(i);
        all.push_back({preset.name(), preset.symbol(), preset, ""});
    }
    const AnyVector missing = qvPresetMgr()->missingPresets();
    for (const Any& row : missing) {
        const AnyDict& preset = row.asDict();
        all.push_back({preset.getString("name", ""), qvProfileToSym(preset.getInt32("profile", -1)),
                       std::nullopt, namesOf(preset.getVector("waitsFor"))});
    }
    return all;
}

template <class Row>
const Row* find(const std::vector<Row>& rows, const std::string& name) {
    const std::string folded = foldedName(name);
    for (const bool exact : {true, false})
        for (const Row& row : rows)
            for (const std::string& one : {row.name, row.symbol})
                if (!one.empty() && (exact ? one == name : foldedName(one) == folded)) return &row;
    return nullptr;
}

// Near names are found in small letters, and shown as they are.
std::string nearMatches(const std::string& name, const std::vector<Known>& all) {
    std::vector<std::string> words, small;
    for (const Known& row : all)
        for (const std::string& one : {row.name, row.symbol})
            if (!one.empty()) words.push_back(one), small.push_back(foldedName(one));
    std::string hint = suggestion(foldedName(name), small);
    for (size_t i = 0; i < words.size(); ++i)
        if (const size_t at = hint.find("'" + small[i] + "'"); at != std::string::npos)
            hint.replace(at + 1, small[i].size(), words[i]);
    return hint;
}

}  // namespace

// Letters beyond ASCII are compared as they are.
std::string foldedName(std::string name) {
    std::transform(name.begin(), name.end(), name.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c; });
    return name;
}

std::vector<std::string> builtinFoldedNames() {
    std::vector<std::string> names;
    for (const Known& row : builtinNames())
        for (const std::string& one : {row.name, row.symbol})
            if (!one.empty()) names.push_back(foldedName(one));
    return names;
}

std::string namesOf(const AnyVector& names) {
    std::vector<std::string> words;
    for (const Any& name : names) words.emplace_back(name.toString().asString(""));
    return joined(words);
}

QvPreset findPreset(const std::string& name) {
    const QvUserPresets own = PresetStore::read();
    std::vector<Known> all = ownNames(own);
    for (Known& row : builtinNames()) all.push_back(std::move(row));
    const Known* const found = find(all, name);
    if (!found) throw failure(Msg::presetUnknown, {name, nearMatches(name, all)});
    if (!found->preset) throw failure(Msg::presetWaits, {found->name, found->waitsFor});
    return found->preset->isCustom() ? withInstalledModules(*found->preset) : *found->preset;
}

QvPreset withInstalledModules(const QvPreset& preset) {
    QvUserPresets one;
    one.append(preset);
    one.checkPresets(QvUserPresets::substituteModules);
    return one.at(0);
}

int presetPlace(const QvUserPresets& presets, const std::string& name) {
    const std::vector<Known> all = ownNames(presets);
    const Known* const found = find(all, name);
    return found ? static_cast<int>(found - all.data()) : -1;
}

int findUserPreset(const QvUserPresets& presets, const std::string& name) {
    if (const int place = presetPlace(presets, name); place >= 0) return place;
    const std::vector<Known> builtin = builtinNames();
    if (const Known* const row = find(builtin, name)) throw failure(Msg::presetBuiltin, {row->name});
    throw failure(Msg::presetUnknown, {name, nearMatches(name, ownNames(presets))});
}

void requireFreeName(const std::string& name) {
    if (name.empty() || presetNameOf(name) != name) throw failure(Msg::presetNameWrong, {name});
    const std::vector<Known> builtin = builtinNames();
    if (const Known* const row = find(builtin, name)) throw failure(Msg::presetNameTaken, {name, row->name});
}
