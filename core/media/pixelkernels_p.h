// Arithmetic on runs of samples, for the best vector unit of the machine. Every one gives the same bytes on
// every machine. Spans may begin at any address and have any length; dst may be src, but must not overlap it
// otherwise. Words are 16-bit samples in the machine's order, counted in words.
#pragma once

#include <cstddef>

#include "core/arch/api.h"

namespace qvpixels {

using Byte = unsigned char;

// dst = (a + b) >> 1
void averageBytes(Byte* dst, const Byte* a, const Byte* b, std::size_t bytes);
void averageWords(Byte* dst, const Byte* a, const Byte* b, std::size_t words);

// One mask byte a sample: w = (mask + 1) >> 1, dst = (dst * (128 - w) + src * w) >> 7
void maskBytes(Byte* dst, const Byte* src, const Byte* mask, std::size_t bytes);
void maskWords(Byte* dst, const Byte* src, const Byte* mask, std::size_t words);

// alpha 0 to 255: dst = (dst * (256 - alpha) + src * alpha) >> 8
void mixBytes(Byte* dst, const Byte* src, int alpha, std::size_t bytes);
void mixWords(Byte* dst, const Byte* src, int alpha, std::size_t words);

// Mask bytes for samples: takes every step-th byte (1 or 2; 2 * pixels bytes are read) and writes it `copies`
// times (1 to 4).
void spreadMask(Byte* dst, const Byte* mask, int step, int copies, std::size_t pixels);

// Which unit the others run on, as in "AVX2".
const char* vectorUnit();

}  // namespace qvpixels
