// Work on lines of 16-bit samples, for the best vector unit of the machine: the two passes of scaling, and
// the matrices. In floats that are multiplied and added one after the other in one order, so every unit gives
// the same bytes.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "builtin/kernels/formats/matrix.h"
#include "builtin/kernels/scale/axis.h"

namespace srk {

// The pass across of an axis: its weights tap by tap, for all samples each.
struct DeepAcross {
    std::vector<float> weights;
    // Samples lie four apart, the first one's taps from `first` on, and all have the same eight weights.
    bool everyFourth = false;
    int first = 0;
};
DeepAcross makeDeepAcross(const Axis& axis);

// `from` has axis.source samples, `padded` room for them with beforeLine and afterLine samples around.
void deepAcross(const Axis& axis, const DeepAcross& across, const uint16_t* from, float* padded, float* to);
// `taps` lines; rounded to the nearest and clamped.
void deepDown(const float* const* lines, const float* weights, int taps, uint16_t* to, size_t n);
void deepDown(const uint16_t* const* lines, const float* weights, int taps, uint16_t* to, size_t n);

// Three planes; `to` may be `from`. The second and third target may be null: luma alone.
void deepMatrix(const Deep& deep, const uint16_t* const from[3], uint16_t* const to[3], size_t n);

// Each sample twice; linear interpolation between chroma samples that lie on every second pixel, `n` pixels
// from n / 2 samples; every second sample, n of 2 * n.
void twice(uint16_t* to, const uint16_t* from, size_t n);
void doubleLine(uint16_t* to, const uint16_t* from, size_t n);
void evens(uint16_t* to, const uint16_t* from, size_t n);

const char* deepUnit();

}  // namespace srk
