// What the user asks of a transcode, as far as the plan depends on it. Texts are as they were given; empty
// when they were not.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "tarsel/picture/effects.h"

struct PlanOptions {
    std::vector<std::string> inputs;
    std::string output, format, muxer, saveTask;
    std::string from, to, duration;
    EffectOptions effects;
    std::optional<int> samplerate, channels, bits;
    bool noVideo = false, noAudio = false;
    bool splitChannels = false;
    bool acceptPartial = false;
};
