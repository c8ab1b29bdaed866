#include "builtin/kernels/scale/axis.h"

#include <algorithm>
#include <cmath>
#include <span>

namespace srk {

namespace {

double cubic(double x) {
    x = std::abs(x);
    if (x < 1) return (1.5 * x - 2.5) * x * x + 1;
    if (x < 2) return ((-0.5 * x + 2.5) * x - 4) * x + 2;
    return 0;
}

double triangle(double x) { return std::max(0.0, 1 - std::abs(x)); }

struct Kernel {
    Filter filter;
    double stretch;  // source samples for a unit of the filter, at least 1
    int taps;
    SincPhases phases{};
};

Kernel kernelOf(Filter filter, double step) {
    Kernel kernel{filter, std::max(1.0, std::abs(step)), 1};
    if (filter == Filter::sinc) {
        kernel.taps = 8;
        kernel.phases = sincPhases(1 / std::max(std::abs(step), 1e-9));
    } else if (filter != Filter::nearest) {
        const double radius = filter == Filter::cubic ? 2 : 1;
        kernel.stretch = std::min(kernel.stretch, maxTaps / (2 * radius));
        kernel.taps = 2 * static_cast<int>(std::ceil(radius * kernel.stretch));
        if (filter == Filter::linear && std::abs(step) <= 1) kernel.taps = 2;
    }
    return kernel;
}

// Weights with a sum of 1 for a sample at `position`; the index of the first tap is returned.
int weigh(const Kernel& kernel, double position, std::span<double> out) {
    if (kernel.filter == Filter::nearest) {
        out[0] = 1;
        return static_cast<int>(std::ceil(position - 0.5));
    }
    const int whole = static_cast<int>(std::floor(position));
    if (kernel.filter == Filter::sinc) {
        const auto phase = static_cast<unsigned>(std::lround((position - whole) * 8));
        for (unsigned i = 0; i < 8; ++i) out[i] = kernel.phases[phase][i] / unity;
        return whole - 3;
    }
    const int first = whole - kernel.taps / 2 + 1;
    double sum = 0;
    for (std::size_t i = 0; i < out.size(); ++i) {
        const double x = (first + static_cast<int>(i) - position) / kernel.stretch;
        out[i] = kernel.filter == Filter::cubic ? cubic(x) : triangle(x);
        sum += out[i];
    }
    for (double& weight : out) weight /= sum;
    return first;
}

// Rounds so that the sum stays: what is missing goes to the weights that rounding moved most.
void roundWeights(std::span<const double> from, std::span<int16_t> to) {
    int left = unity;
    for (std::size_t i = 0; i < from.size(); ++i) {
        to[i] = static_cast<int16_t>(std::lround(from[i] * unity));
        left -= to[i];
    }
    for (; left != 0; left += left < 0 ? 1 : -1) {
        std::size_t best = 0;
        double most = -1e9;
        for (std::size_t i = 0; i < from.size(); ++i) {
            const double moved = (from[i] * unity - to[i]) * (left > 0 ? 1 : -1);
            if (moved > most) {
                most = moved;
                best = i;
            }
        }
        to[best] = static_cast<int16_t>(to[best] + (left > 0 ? 1 : -1));
    }
}

bool isWhole(double value) { return value == std::floor(value); }

// For bytes in 1/65536, so that equal ratios give equal weights along the line.
double positionOf(const Mapping& mapping, int i, int source, bool exact) {
    double at = mapping.first + i * mapping.step;
    if (!exact) at = std::floor(at * 65536 + 0.5) / 65536;
    return std::clamp(at, 0.0, static_cast<double>(source - 1));
}

}  // namespace

Axis makeAxis(const Mapping& mapping, int source, int target, Filter filter, bool deep) {
    Axis axis;
    axis.source = source;
    axis.target = target;
    const double last = mapping.first + (target - 1);
    if (mapping.step == 1 && isWhole(mapping.first) && mapping.first >= 0 && last <= source - 1) {
        axis.copies = true;
        axis.offset = static_cast<int>(mapping.first);
        return axis;
    }
    const Kernel kernel = kernelOf(filter, mapping.step);
    const auto taps = static_cast<std::size_t>(kernel.taps), count = static_cast<std::size_t>(target);
    axis.taps = kernel.taps;
    axis.start.resize(count);
    if (deep)
        axis.exact.resize(count * taps);
    else
        axis.weights.resize(count * taps);
    std::vector<double> weights(taps);
    for (std::size_t i = 0; i < count; ++i) {
        const bool exact = deep && filter != Filter::nearest;
        axis.start[i] = weigh(kernel, positionOf(mapping, static_cast<int>(i), source, exact), weights);
        if (deep)
            std::transform(weights.begin(), weights.end(), axis.exact.begin() + static_cast<long>(i * taps),
                           [](double w) { return static_cast<float>(w); });
        else
            roundWeights(weights, std::span(axis.weights).subspan(i * taps, taps));
    }
    return axis;
}

}  // namespace srk
