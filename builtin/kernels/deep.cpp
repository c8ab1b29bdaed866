#include "builtin/kernels/deep.h"

#include <algorithm>

#include "builtin/kernels/scale8.h"

namespace srk {

namespace {

uint16_t sampleOf(float value) { return static_cast<uint16_t>(std::clamp(value + 0.5f, 0.0f, 65535.0f)); }

constexpr int chunk = 64;  // sums that stay in registers or the nearest cache

}  // namespace

void deepAcross(const Axis& axis, const uint16_t* from, float* padded, float* to) {
    if (axis.copies) {
        for (int i = 0; i < axis.target; ++i) to[i] = from[i + axis.offset];
        return;
    }
    std::fill(padded, padded + beforeLine, static_cast<float>(from[0]));
    float* line = padded + beforeLine;
    for (int i = 0; i < axis.source; ++i) line[i] = from[i];
    std::fill(line + axis.source, line + axis.source + behindLine, static_cast<float>(from[axis.source - 1]));
    const float* weights = axis.exact.data();
    for (int i = 0; i < axis.target; ++i, weights += axis.taps) {
        const float* at = line + axis.start[static_cast<size_t>(i)];
        float sum = 0;
        for (int t = 0; t < axis.taps; ++t) sum += at[t] * weights[t];
        to[i] = sum;
    }
}

void deepDown(const float* const* lines, const float* weights, int taps, uint16_t* to, int n) {
    for (int first = 0; first < n; first += chunk) {
        const int count = std::min(chunk, n - first);
        float sums[chunk] = {};
        for (int t = 0; t < taps; ++t) {
            const float weight = weights[t];
            const float* line = lines[t] + first;
            for (int i = 0; i < count; ++i) sums[i] += line[i] * weight;
        }
        for (int i = 0; i < count; ++i) to[first + i] = sampleOf(sums[i]);
    }
}

void deepMatrix(const Deep& deep, const uint16_t* const from[3], uint16_t* const to[3], int n) {
    float m[3][3], add[3];
    for (int i = 0; i < 3; ++i) {
        add[i] = static_cast<float>(deep.add[i]);
        for (int k = 0; k < 3; ++k) m[i][k] = static_cast<float>(deep.m[i][k]);
    }
    for (int first = 0; first < n; first += chunk) {
        const int count = std::min(chunk, n - first);
        float in[3][chunk];
        for (int k = 0; k < 3; ++k)
            for (int i = 0; i < count; ++i) in[k][i] = from[k][first + i];
        for (int k = 0; k < 3; ++k)
            for (int i = 0; i < count; ++i)
                to[k][first + i] =
                    sampleOf(m[k][0] * in[0][i] + m[k][1] * in[1][i] + m[k][2] * in[2][i] + add[k]);
    }
}

}  // namespace srk
