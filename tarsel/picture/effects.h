// What is to happen to a picture on its way: the options that `transcode` and `frame` share.
#pragma once

#include <string>
#include <vector>

class Command;

// As they were given; empty when they were not.
struct EffectOptions {
    std::string size, fit, rate, pixel, matrix;
    std::string deinterlace, crop, fade, timecode, subtitles, subtitleStyle;
    std::vector<std::string> logos, filters;
    bool flip = false;
    bool acceptPartial = false;  // subtitles that can't be read are left out

    bool any() const;
    // The first given option that needs a picture; --filter is not asked.
    std::string given() const;
    // Throws Failure for what is wrong with any input.
    void check() const;
};

// The values of --deinterlace.
const std::vector<std::string>& deinterlaceMethods();

void addEffectOptions(Command& command, EffectOptions& options);
