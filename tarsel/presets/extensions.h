// What an output's name means beyond the formats of the tool itself: the presets of an extension, and the
// codecs where none of them is installed.
#pragma once

#include <span>
#include <string_view>

struct PresetExtension {
    static constexpr int most = 3;
    std::string_view extension;  // without the dot, in small letters
    const char* muxer;
    const char* video;  // codec, by its name in the table of codecs; null for files of sound alone
    const char* audio;  // null for pictures alone
    const char* presets[most] = {};    // names or symbols, the first one that is installed is taken
    const char* otherMuxer = nullptr;  // for presets that do not have the first one; null for none
    const char* pixel = nullptr;  // format of raw pictures that all programs read; null for that of the input

    bool soundOnly() const { return !video; }
};

std::span<const PresetExtension> presetExtensions();
// The row of an extension, or null.
const PresetExtension* presetExtension(std::string_view extension);
