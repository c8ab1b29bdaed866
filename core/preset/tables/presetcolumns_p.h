// What the columns of a family come to with the modules that are installed.
#pragma once

#include <vector>

#include "core/engine/modules/codeccompat.h"
#include "core/preset/tables/presetfamilies_p.h"
#include "core/value/anycontainer.h"

// Module names, the first is the default.
struct PresetColumns {
    AnyVector video;
    AnyVector audio;
    AnyVector muxers;

    // Whether a preset can be made of them.
    bool complete() const { return !video.empty() && !muxers.empty(); }
};

// `pairs` are those of the installed modules. Without video encoder the other columns stay empty.
PresetColumns qvPresetColumns(const PresetFamily& family, const InstalledModules& installed,
                              const CodecCompat& pairs);

// The multiplexers of a family, with those that its table leaves to the pairs: in the order of the pairs, the
// one for elementary streams at the end.
std::vector<const char*> qvFamilyMuxers(const PresetFamily& family);
