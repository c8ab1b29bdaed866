// Work on lines of 16-bit samples: the two passes of scaling, and the matrices. In floats that are added in
// one order, so every machine gives the same bytes.
#pragma once

#include <cstdint>

#include "builtin/kernels/axis.h"
#include "builtin/kernels/matrix.h"

namespace srk {

// `from` has axis.source samples, `padded` room for them with beforeLine and behindLine samples around.
void deepAcross(const Axis& axis, const uint16_t* from, float* padded, float* to);
// taps lines of floats; rounded to the nearest and clamped.
void deepDown(const float* const* lines, const float* weights, int taps, uint16_t* to, int n);

// Three planes; `to` may be `from`.
void deepMatrix(const Deep& deep, const uint16_t* const from[3], uint16_t* const to[3], int n);

}  // namespace srk
