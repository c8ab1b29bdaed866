// What is to happen to a sound on its way: the options of `transcode`.
#pragma once

#include <string>
#include <vector>

class Command;

// As they were given; empty when they were not.
struct SoundOptions {
    std::vector<std::string> volumes;
    std::string delay, normalize, map, dither;
    std::vector<double> gains;  // dB of each sound, which were measured for `normalize`

    // The first given option that needs a sound.
    std::string given() const;
    // Throws Failure for what is wrong with any input.
    void check() const;
};

void addSoundOptions(Command& command, SoundOptions& options);
