// Packed 4:2:2 to luma and to chroma that is scaled down at once: chroma is taken out of a line once for each
// target line, and never stored in between. For the best vector unit of the machine; each gives the same
// bytes.
#pragma once

#include <cstddef>
#include <cstdint>

namespace srk {

using Byte = unsigned char;

// `n` pixels of a line; `lumaFirst`: YUYV, else UYVY.
void packedToLuma(const Byte* from, Byte* y, size_t n, bool lumaFirst);

// `n` samples of each chroma plane from four lines: (sum of sample * weight + 64) >> 7. Weights are 0 to 127,
// with a sum of 128. Without weights: those of the first line.
void packedToChroma(const Byte* const lines[4], const Byte* weights, Byte* u, Byte* v, size_t n,
                    bool lumaFirst);

const char* packedChromaUnit();

}  // namespace srk
