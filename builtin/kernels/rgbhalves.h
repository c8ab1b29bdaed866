// Pixels of four bytes to luma and to chroma of every second pixel, which is filtered before the matrix: a
// quarter of the products, and one rounding. For the best vector unit of the machine; each gives the same
// bytes.
//
//     half:    sums of B, G, R, x over the pixels 2 i - 1, 2 i (twice), 2 i + 1, or four times pixel 2 i
//     chroma:  half lines, weighted down with a sum of 16, through the matrix
#pragma once

#include <cstddef>
#include <cstdint>

#include "builtin/kernels/matrix.h"

namespace srk {

using Byte = unsigned char;

constexpr int halvesUnity = 16;

void rgb4ToLuma(const ToYuv& rows, const Byte* from, Byte* y, size_t n);
// `n` pixels to 4 * (n / 2) words. The end pixels are repeated.
void rgb4Halves(const Byte* from, int16_t* half, size_t n, bool filtered);
// `n` samples of each.
void halvesToChroma(const ToYuv& rows, const int16_t* const* lines, const int* weights, int taps, Byte* u,
                    Byte* v, size_t n);

const char* rgbHalvesUnit();

}  // namespace srk
