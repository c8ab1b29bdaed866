// Codecs by the names that people give them, and the encoders that write each.
#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

struct CodecName {
    static constexpr int most = 6;
    std::string_view name;         // in small letters, without dots, hyphens and blanks
    int type;                      // qvVideoStream or qvAudioStream
    const char* modules[most];     // encoders, the preferred one first; null for none
    const char* preset = nullptr;  // symbol of the one that asks its encoder for this codec; null for none
    // Of an encoder of several codecs: the value of its parameter "standard"; null for its usual one.
    const char* standard = nullptr;

    std::span<const char* const> encoders() const;
};

std::span<const CodecName> codecNames();

// The row of a name in any spelling, as "H.264" and "E-AC-3"; null for none.
const CodecName* codecName(std::string_view name, int type);
// The names of a type of stream, and of its installed encoders.
std::vector<std::string> namesOfCodecs(int type);
// What people call what an encoder writes: the first of its names, or that of the module.
std::string codecOfModule(std::string_view module);
