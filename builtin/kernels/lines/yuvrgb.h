// Planes of YUV to RGB, for the best vector unit of the machine; each gives the same bytes.
#pragma once

#include <cstddef>
#include <cstdint>

#include "builtin/kernels/formats/matrix.h"

namespace srk {

using Byte = unsigned char;

void yuvToRgb(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* b, Byte* g, Byte* r,
              size_t n);
// To packed pixels of 3 or 4 bytes, the fourth 255. `repeated`: `u` and `v` have n / 2 samples, for two
// pixels each; the last one also for an odd pixel. `n` is at least 2 then.
void yuvToRgb4(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* to, size_t n,
               bool repeated);
void yuvToRgb3(const ToRgb& rows, const Byte* y, const Byte* u, const Byte* v, Byte* to, size_t n,
               bool repeated);

const char* yuvRgbUnit();

}  // namespace srk
