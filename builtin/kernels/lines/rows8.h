// Kernels on lines of 8-bit samples, for the best vector unit of the machine. Each gives the same bytes on
// every unit, and as the plain loop that ends it. Lines may begin at any address and have any length;
// nothing beyond their samples is read or written. A target may be a source of the same sample size, but must
// not overlap one otherwise.
#pragma once

#include <cstddef>
#include <cstdint>

#include "builtin/kernels/formats/matrix.h"

namespace srk {

using Byte = unsigned char;

// Pixels of four or three bytes to planes and back. `d` may be null: dropped, or written as 255.
void split4(const Byte* from, Byte* a, Byte* b, Byte* c, Byte* d, size_t n);
void join4(Byte* to, const Byte* a, const Byte* b, const Byte* c, const Byte* d, size_t n);
void split3(const Byte* from, Byte* a, Byte* b, Byte* c, size_t n);
void join3(Byte* to, const Byte* a, const Byte* b, const Byte* c, size_t n);
// Drops the fourth byte of each pixel; adds one of 255.
void pack4to3(Byte* to, const Byte* from, size_t n);
void pack3to4(Byte* to, const Byte* from, size_t n);
// `n` pixels of 4:2:2, n / 2 chroma samples; a last odd pixel has U alone, which writes as the last one does.
void splitYuyv(const Byte* from, Byte* y, Byte* u, Byte* v, size_t n, bool lumaFirst);
void joinYuyv(Byte* to, const Byte* y, const Byte* u, const Byte* v, size_t n, bool lumaFirst);

// Words with blue in the low five bits, then green in six or five, and red. Spread over 8 bits by repeating
// their upper bits, and back to the nearest.
void split565(const Byte* from, Byte* b, Byte* g, Byte* r, size_t n, bool green6);
void join565(Byte* to, const Byte* b, const Byte* g, const Byte* r, size_t n, bool green6);

// Planes B, G, R or packed pixels of four bytes to planes of YUV in 4:4:4. `u` and `v` may be null: luma
// alone.
void rgbToYuv(const ToYuv& rows, const Byte* b, const Byte* g, const Byte* r, Byte* y, Byte* u, Byte* v,
              size_t n);
void rgb4ToYuv(const ToYuv& rows, const Byte* from, Byte* y, Byte* u, Byte* v, size_t n);
// In place.
void yuvToOther(const ToOther& rows, Byte* y, Byte* u, Byte* v, size_t n);
// Full levels to video levels, round(x * 219 / 255) + 16, and back with clamping.
void toVideoLevels(Byte* to, const Byte* from, size_t n);
void toFullLevels(Byte* to, const Byte* from, size_t n);

// To 16 bits: x * 256, or x * 257 where 255 stands for 65535. Back: to the nearest.
void widen(uint16_t* to, const Byte* from, size_t n, bool full);
void narrow(Byte* to, const uint16_t* from, size_t n, bool full);

// Each sample twice: 2 * n samples.
void twice(Byte* to, const Byte* from, size_t n);
// Every second sample, from the first on: n of 2 * n.
void evens(Byte* to, const Byte* from, size_t n);
// Linear interpolation, rounded to the nearest, between chroma samples that lie on every second pixel: `n`
// pixels from n / 2 samples; after the last sample its value is repeated.
void doubleLine(Byte* to, const Byte* from, size_t n);

const char* rows8Unit();  // which unit runs, as in "AVX2"

}  // namespace srk
