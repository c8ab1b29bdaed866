// --map: which channels of a sound make the channels of the output.
#pragma once

#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

struct ChannelMap {
    static constexpr int most = 16;  // channels of the output, and of those that one is the mean of

    int sound = 0;                       // whose channels these are, among the sounds of all inputs
    std::vector<std::vector<int>> rows;  // one a channel of the output; an empty one is silence

    // Whether every channel is one of the input, as it is there, or silence.
    bool copies() const;
    // In the form that a link takes.
    AnyVector matrix() const;
};

// "1,0,0+1,-" and "a:1.0,a:1.1". Throws Failure (usage).
ChannelMap parseChannelMap(const std::string& text);
