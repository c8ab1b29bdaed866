// What plug-ins add to the catalogue of presets: the attribute "presets" of a plug-in, and the attribute
// "compatMuxers" of its encoders, and the attribute "compatCodecs" of its multiplexers. They come from
// outside: what is ill-formed is left out, with a line in the log.
#pragma once

#include <string>
#include <vector>

#include "core/engine/modules/codeccompat.h"
#include "core/preset/tables/modulenames_p.h"
#include "core/value/anycontainer.h"

// One preset, its columns reduced to the modules that are installed.
struct PluginPreset {
    int profile = 0;
    std::string name;
    std::string group;
    AnyVector video;  // empty for a preset of sound alone
    AnyVector audio;
    AnyVector muxers;  // each goes with one of the video encoders, or of the audio encoders without these
};

// Those of all plug-ins in load order for which modules are installed. No number is used twice, and
// no name, those of the presets in `taken` included.
std::vector<PluginPreset> qvPluginPresets(const AnyVector& taken, const CodecCompat& pairs,
                                          const InstalledModules& installed);

// Adds the pairs that encoders and multiplexers name, as far as both are installed.
void qvAddPluginPairs(CodecCompat& pairs, const InstalledModules& installed);
