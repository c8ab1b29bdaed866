// When the pictures of an elementary stream are shown, which has no times.
#pragma once

#include <string>
#include <vector>

#include "plugins/av/source/mediainput.h"

namespace av {

struct ShownOrder {
    std::vector<long long> places;  // of each unit in decoding order: its number in the order of showing
    int delay = 0;                  // units by which decoding precedes showing
};

// Reads a stream of `input` to its end, and goes back to its start. False with a text on failure.
bool shownOrder(MediaInput& input, int stream, ShownOrder& order, std::string& problem);

}  // namespace av
