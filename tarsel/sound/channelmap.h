// --map: which channels of a sound make the channels of the output.
#pragma once

#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

struct ChannelMap {
    static constexpr int most = 16;  // channels of the output, and of those that one is the mean of

    struct Input {
        int sound = 0;  // among those of all inputs
        int channel = 0;
        bool operator==(const Input&) const = default;
    };
    std::vector<std::vector<Input>> rows;  // one a channel of the output; an empty one is silence

    // The sounds that take part, in rising order; the first one if there is nothing but silence.
    std::vector<int> sounds() const;
    // Whether every channel is one of the input, as it is there, or silence.
    bool copies() const;
    // In the form that a link takes. `first`: for each of sounds() the channel of the link's input that is
    // its channel 0.
    AnyVector matrix(const std::vector<int>& first) const;
};

// "1,0,0+1,-" and "a:1.0,a:1.1". Throws Failure (usage).
ChannelMap parseChannelMap(const std::string& text);
