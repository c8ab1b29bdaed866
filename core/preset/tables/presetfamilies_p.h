// The presets of this library: 98, in families that share their candidates for modules.
#pragma once

#include <span>

#include "core/preset/tables/modulenames_p.h"

struct FamilyMember {
    int profile;
    const char* name;
};

struct PresetFamily {
    ModuleRow video;
    ModuleRow audio;          // empty: every encoder that goes with one of the multiplexers
    ModuleRow muxers;         // empty: every multiplexer that goes with one of the video encoders
    FamilyMember members[9];  // what is left has no name

    std::span<const FamilyMember> presets() const;
};

// In the order of the list of presets.
std::span<const PresetFamily> qvPresetFamilies();
