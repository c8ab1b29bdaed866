// The built-in presets: those of this library, then those of plug-ins, as far as their modules are installed.
#pragma once

#include <vector>

#include "core/engine/modules/codeccompat.h"
#include "core/preset/presetgroup.h"
#include "core/preset/qvpreset.h"

struct PresetFamily;

struct BuiltinCatalogue {
    QvPresetList presets;
    PresetGroupList groups;
    CodecCompat pairs;  // the encoders and multiplexers that go together

    struct Missing {
        const PresetFamily* family;
        bool encoderInstalled;
    };
    std::vector<Missing> missing;  // families without presets here

    // Of the modules that are installed now.
    static BuiltinCatalogue make();
    AnyVector missingPresets() const;  // see QvPresetMgr
};
