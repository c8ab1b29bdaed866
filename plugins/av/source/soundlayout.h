// Where the channels of sound are, of which only their number is known.
#pragma once

#include "plugins/av/source/avheaders.h"

namespace av {

// Left, right and centre for three; the corners for four; else what the libraries have as usual.
// False without memory.
bool setUsualLayout(AVChannelLayout& layout, int channels);

}  // namespace av
