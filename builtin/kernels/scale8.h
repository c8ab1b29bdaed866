// The two passes that scale a plane of 8-bit samples: across, into words that hold the exact sum, and down,
// with the only rounding.
//
//     word = sum of sample * weight - 16384, weights adding up to 128
//     byte = (sum of (word + 16384) * weight + 8192) >> 14, clamped
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "builtin/kernels/axis.h"

namespace srk {

using Byte = unsigned char;

// What the pass across reads for eight target samples at a time. Where these lie close enough together, each
// pair of taps is picked out of 16 source bytes; else every sample has its own run of taps.
struct Across {
    int target = 0, source = 0, taps = 1;
    enum Form : uint8_t { copy, blocks, runs, plain } form = copy;
    int offset = 0;               // of a copy
    std::vector<int32_t> base;    // of a block, or of each sample
    std::vector<Byte> order;      // for each block: which bytes, for the pairs and for the centre pair
    std::vector<int8_t> weights;  // blocks: 16 for each pair of taps; runs: taps rounded up to 16
    std::vector<int16_t> words;   // plain: taps of each sample
};
Across makeAcross(const Axis& axis);

// Lines that the pass across reads have this many bytes more before and behind, which repeat the ends.
constexpr int beforeLine = maxTaps + 16;
constexpr int behindLine = maxTaps + 48;
// Words are written in whole vectors: a line of them has room for this many, and a multiple of it.
constexpr int wordBlock = 32;

void padLine(Byte* to, const Byte* from, int n);  // `to` is where sample 0 goes

// `from`: sample 0 of a padded line, or of any line if the form is copy.
void scaleAcross(const Across& across, const Byte* from, int16_t* to);
// `taps` lines of words, taps even or 1.
void scaleDown(const int16_t* const* lines, const int16_t* weights, int taps, Byte* to, int n);

const char* scale8Unit();

}  // namespace srk
