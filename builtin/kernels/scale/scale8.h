// The two passes that scale a plane of 8-bit samples: across, into words that hold the exact sum, and down,
// with the only rounding.
//
//     word = sum of sample * weight - 16384, weights adding up to 128
//     byte = (sum of (word + 16384) * weight + 8192) >> 14, clamped
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "builtin/kernels/scale/axis.h"

namespace srk {

using Byte = unsigned char;

// What the pass across reads for sixteen target samples at a time, in two blocks of eight. Where the samples
// of a block lie close enough together, each pair of taps is picked out of 16 or 32 source bytes; else every
// sample has its own run of taps.
struct Across {
    int target = 0, source = 0, taps = 1;
    enum Form : uint8_t {
        copy,
        halves,    // every second sample with a quarter of each neighbour
        quarters,  // samples four apart, with the same eight weights each
        blocks,
        wide,  // blocks of 32 source bytes
        runs,
        plain
    } form = copy;
    int offset = 0;               // of a copy
    std::vector<int32_t> base;    // of a block, or of each sample
    std::vector<Byte> order;      // for two blocks: which bytes, for all pairs and for the centre pair
    std::vector<int8_t> weights;  // for two blocks: 32 for each pair of taps; runs: taps of each sample
    std::vector<int16_t> words;   // plain: taps of each sample
};
Across makeAcross(const Axis& axis);

// Lines that the pass across reads have this many bytes more before and after, which repeat the ends.
constexpr int beforeLine = maxTaps + 16;
constexpr int afterLine = maxTaps + 48;
// Words are written in whole vectors: a line of them has room for this many, and a multiple of it.
constexpr int wordBlock = 32;

void padLine(Byte* to, const Byte* from, int n);  // `to` is where sample 0 goes

// `from`: sample 0 of a padded line, or of any line if the form is copy.
void scaleAcross(const Across& across, const Byte* from, int16_t* to);
// `taps` lines of words, taps even or 1.
void scaleDown(const int16_t* const* lines, const int16_t* weights, int taps, Byte* to, int n);

// Only the pass down, on bytes. `taps` is even. The weights come in pairs: that of tap t, then that of tap t
// + taps / 2. Rounded to the nearest.
void scaleDownBytes(const Byte* const* lines, const int8_t* weights, int taps, Byte* to, int n);

// The weights of each line of an axis as scaleDownBytes takes them. Empty: they do not fit bytes. A line that
// is a copy of one other has the weight 128, which no byte holds: there is a 0, which must not be used.
std::vector<int8_t> downBytesWeights(const Axis& axis);

const char* scale8Unit();

}  // namespace srk
