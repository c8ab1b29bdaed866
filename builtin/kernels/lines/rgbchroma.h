// Pixels of four bytes to luma and to chroma of every second pixel, which is filtered before the matrix: a
// quarter of the products, and one rounding. For the best vector unit of the machine; each gives the same
// bytes.
#pragma once

#include <cstddef>
#include <cstdint>

#include "builtin/kernels/formats/matrix.h"

namespace srk {

using Byte = unsigned char;

void rgb4ToLuma(const ToYuv& rows, const Byte* from, Byte* y, size_t n);

// n / 2 samples of each from four lines of n pixels. `weights` of the lines have a sum of chromaUnity.
// `filtered`: across, a half of pixel 2 i and a quarter of each neighbour, the first one repeated; else
// pixel 2 i alone.
constexpr int chromaUnity = 16;
void rgb4ToChroma(const ToYuv& rows, const Byte* const lines[4], const Byte weights[4], bool filtered,
                  Byte* u, Byte* v, size_t n);

const char* rgbChromaUnit();

}  // namespace srk
