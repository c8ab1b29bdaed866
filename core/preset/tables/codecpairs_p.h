// Which encoder goes with which multiplexer, as far as the engine knows the modules by name.
#pragma once

#include <optional>
#include <span>

#include "core/engine/modules/codeccompat.h"
#include "core/preset/tables/modulenames_p.h"

struct CodecPairs {
    const char* encoder;
    int kind;  // QvModuleType::videoEncoder or audioEncoder
    ModuleRow muxers;
};

// All pairs, whatever is installed. Columns of presets follow its order.
std::span<const CodecPairs> qvCodecPairs();

// The pairs whose two modules are installed.
CodecCompat qvInstalledPairs(const InstalledModules& installed);

// LPCM goes into containers of few profiles only. The answer for such a pair under a profile (-1: none), or
// nothing for any other pair.
std::optional<bool> qvPairByProfile(const char* encoder, const char* muxer, int profile);
