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

// The row between `above` and `below` of one field, `other` being the row that the other field has there. For
// each sample, with w from 0 to 256:
//
//     mean   = (above + below + 1) >> 1
//     median = the middle one of above, below and other
//     row    = (mean * (256 - w) + median * w + 128) >> 8
//
// Rows begin at any address and have any length; `row` overlaps none of the others.
void fillRow(Samples samples, Byte* row, const Byte* above, const Byte* below, const Byte* other, int w,
             std::size_t bytes);

}  // namespace qvbob
