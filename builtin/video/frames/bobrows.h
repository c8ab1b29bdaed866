// The missing rows of a field, made from the rows around them, for the best vector unit of the machine. Every
// unit gives the same bytes.
#pragma once

#include <cstddef>

namespace qvbob {

using Byte = unsigned char;

// How the samples of a format lie in its rows.
enum class Samples {
    bytes,
    words,   // 16 bits, in the machine's order
    tens,    // three of 10 bits in 32 (v210)
    rgb555,  // in 16 bits
    rgb565,
};

Samples samplesOf(unsigned fourcc);

// Three neighbouring rows of a frame; `at` is of the other field than the two around it.
struct Triple {
    const Byte *above, *at, *below;
};

// Fills a missing row of the field that `above` and `below` are of. For each sample, with w from 0 to 256,
// and a step being 1 of 256 levels:
//
//     mean   = (above + below + 1) >> 1
//     change = the most that a sample of the triple differs from the one in `before`, the triple of the frame
//              before; anything from 12 steps on, and no such frame (null rows), is motion
//     room   = 32 * (12 steps - change), at least 0
//     woven  = at, but no more than `room` below or above both of its neighbours
//     row    = (mean * (256 - w) + woven * w + 128) >> 8
//
// Rows begin at any address and have any length; `row` overlaps none of the others.
void fillRow(Samples samples, Byte* row, const Triple& now, const Triple& before, int w, std::size_t bytes);

}  // namespace qvbob
