// The groups of this library's presets.
#pragma once

#include <span>
#include <vector>

struct PresetGroupRow {
    int id;
    const char* name;
    int family;        // all its current profiles, in ascending order; 0: only those listed
    int profiles[19];  // what is left is 0

    std::vector<int> members() const;
};

// In the order of the list of groups.
std::span<const PresetGroupRow> qvPresetGroups();
