// The built-in presets: those of this library, then those of plug-ins, as far as their modules are installed.
#pragma once

#include "core/engine/modules/codeccompat.h"
#include "core/preset/presetgroup.h"
#include "core/preset/qvpreset.h"

struct BuiltinCatalogue {
    QvPresetList presets;
    PresetGroupList groups;
    CodecCompat pairs;  // the encoders and multiplexers that go together
    AnyVector missing;  // see QvPresetMgr::missingPresets

    // Of the modules that are installed now.
    static BuiltinCatalogue make();

    // The group of a preset of this library, whether or not it is installed; null for other numbers.
    static const char* groupOf(int profile);
};
