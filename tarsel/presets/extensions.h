// What an output's name means beyond the formats of the tool itself: the presets of an extension.
#pragma once

#include <span>
#include <string_view>

struct PresetExtension {
    static constexpr int most = 3;
    std::string_view extension;  // without the dot, in small letters
    const char* muxer;
    const char* symbols[most];  // of the presets, or names of those of plug-ins: the first installed one; null for none
    const char* otherMuxer = nullptr;  // for presets that do not have the first one; null for none
};

std::span<const PresetExtension> presetExtensions();
// The row of an extension, or null.
const PresetExtension* presetExtension(std::string_view extension);
