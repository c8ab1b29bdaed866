// The built-in presets followed by presets of a file that rest on them.
#pragma once

#include "core/preset/builtincatalogue_p.h"

struct ExtendedPresets {
    QvPresetList presets;    // a built-in preset has the same index as in the catalogue
    PresetGroupList groups;  // those of the catalogue, with the presets of the source added

    // A preset of the source is left out if its base is not installed, if it has a built-in preset's name, or
    // if no group holds its base.
    static ExtendedPresets make(const BuiltinCatalogue& builtin, const QvPresetList& source);
};
