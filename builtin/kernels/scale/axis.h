// Where the samples of a scaled line or column come from: position and filter weights for each target sample.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

namespace srk {

enum class Filter : uint8_t {
    nearest,  // of two equally near samples the first
    linear,   // triangle
    cubic,    // Catmull-Rom
    sinc      // eight taps, designed for the ratio, at eighths of a sample
};

// Target sample i lies at source sample first + i * step. A negative step mirrors.
struct Mapping {
    double first = 0, step = 1;
    bool operator==(const Mapping&) const = default;
};

// The filters but sinc grow with a reduction, up to this many taps.
constexpr int maxTaps = 64;
constexpr int unity = 128;  // sum of the integer weights of a sample

struct Axis {
    int source = 0, target = 0;  // samples
    int taps = 1;                // 1 or even
    // Sample i is the plain copy of source sample i + offset.
    bool copies = false;
    int offset = 0;
    std::vector<int32_t> start;    // source sample of the first tap; taps beyond the ends repeat the end
    std::vector<int16_t> weights;  // taps for each sample
    std::vector<float> exact;      // the same, not rounded: deep samples
};

// Positions outside of the source are moved to its first or last sample. `deep`: fills `exact` instead of
// `weights`.
Axis makeAxis(const Mapping& mapping, int source, int target, Filter filter, bool deep);

// The designed filter: nine phases from 0 to 1 in eighths, eight taps each, centre at tap 3 + phase; sums of
// 128. `ratio`: target samples for each source sample.
using SincPhases = std::array<std::array<double, 8>, 9>;
SincPhases sincPhases(double ratio);

}  // namespace srk
