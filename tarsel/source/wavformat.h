// What a WAV file holds that the engine does not decode.
#pragma once

#include <cstddef>
#include <string>

// Throws Failure (input) for a file that was refused as WAV: by its format, such as "IMA ADPCM, 4 bits", or
// as none at all. `head`: its first bytes, kWavHead where it has as many; the format stands in them, but for
// odd files.
inline constexpr size_t kWavHead = 1 << 16;
[[noreturn]] void refuseWav(const std::string& name, const std::string& head);
