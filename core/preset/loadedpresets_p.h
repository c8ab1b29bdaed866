// The list that a file of presets is loaded into, with the rule for names that are in use.
#pragma once

#include <string>
#include <unordered_map>

#include "core/preset/qvpreset.h"

class QvLoadedPresets {
  public:
    enum class Names {
        asTheyAre,  // of a list that was cleared: what a file holds twice is there twice
        replace,    // a preset takes the place of the one that has its name
        number,     // it becomes "NAME (1)", "NAME (2)", ...
    };

    // `list` is added to, and outlives this.
    QvLoadedPresets(QvPresetList& list, Names names);

    // The preset has a name. Where it takes another's place, QvPreset::setName says which names are allowed.
    void add(QvPreset preset);

  private:
    std::string freeName(const std::string& name);

    QvPresetList& list_;
    Names names_;
    std::unordered_map<std::string, int> places_;   // of the presets, by their names
    std::unordered_map<std::string, int> numbers_;  // the last one that each name got
};
