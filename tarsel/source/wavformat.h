// What a WAV file holds that the engine does not decode.
#pragma once

#include <string>

// Throws Failure (input) for a file that was refused as WAV: by its format, such as "IMA ADPCM, 4 bits", or
// as none at all.
[[noreturn]] void refuseWav(const std::string& name);
