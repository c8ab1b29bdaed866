// Decoded samples as integers of the engine.
#pragma once

#include <cstddef>
#include <vector>

#include "plugins/av/source/avheaders.h"

namespace av {

// Bits of the integers that samples of that kind become: 8 (unsigned), 16 or 24. 0: a kind that is not known.
int bitsOf(AVSampleFormat format);
// `count` samples of the frame from `first` on, interleaved, little-endian. Floating point is rounded to the
// nearest, ties to even, and 32 bits to the nearest, ties up; both are clipped.
void interleave(const AVFrame& from, int first, int count, std::vector<unsigned char>& to);

}  // namespace av
