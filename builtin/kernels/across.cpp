// Turns positions and weights into what the pass across reads.
#include <algorithm>
#include <cstring>

#include "builtin/kernels/scale8.h"

namespace srk {

namespace {

constexpr int block = 8;

// The sample of a block that stands in for those behind the end of the line.
int sampleOf(const Axis& axis, int i) { return std::min(i, axis.target - 1); }

const int16_t* weightsOf(const Axis& axis, int i) {
    return axis.weights.data() + static_cast<long>(i) * axis.taps;
}

// Two products are added in 16 bits before anything else happens to them.
bool pairFits(int a, int b) {
    const int up = std::max(a, 0) + std::max(b, 0), down = std::min(a, 0) + std::min(b, 0);
    return up * 255 <= 32767 && down * 255 >= -32768;
}

bool byteFits(int weight) { return weight >= -128 && weight <= 127; }

// A weight of 128 is the copy of one sample: the centre pair takes that sample twice, half and half.
int wholeTap(const int16_t* weights, int taps) {
    for (int t = 0; t < taps; ++t)
        if (weights[t] == unity) return std::count(weights, weights + taps, 0) == taps - 1 ? t : -1;
    return -1;
}

bool fitsBlocks(const Axis& axis) {
    const int half = axis.taps / 2;
    for (int first = 0; first < axis.target; first += block) {
        int low = axis.start[static_cast<size_t>(first)], high = low;
        for (int k = 1; k < block; ++k) {
            const int start = axis.start[static_cast<size_t>(sampleOf(axis, first + k))];
            low = std::min(low, start);
            high = std::max(high, start);
        }
        if (high - low + half > 15) return false;
    }
    for (int i = 0; i < axis.target; ++i) {
        const int16_t* w = weightsOf(axis, i);
        const int whole = wholeTap(w, axis.taps);
        if (whole >= 0 && whole % half != half - 1) return false;
        if (whole >= 0) continue;
        for (int t = 0; t < half; ++t)
            if (!byteFits(w[t]) || !byteFits(w[t + half]) || !pairFits(w[t], w[t + half])) return false;
    }
    return true;
}

void makeBlocks(const Axis& axis, Across& across) {
    const int half = axis.taps / 2;
    const int blocks = (axis.target + block - 1) / block;
    across.base.resize(static_cast<size_t>(blocks));
    across.order.resize(static_cast<size_t>(blocks) * 32);
    across.weights.resize(static_cast<size_t>(blocks) * static_cast<size_t>(half) * 16);
    for (int b = 0; b < blocks; ++b) {
        int low = axis.start[static_cast<size_t>(b * block)];
        for (int k = 1; k < block; ++k)
            low = std::min(low, axis.start[static_cast<size_t>(sampleOf(axis, b * block + k))]);
        across.base[static_cast<size_t>(b)] = low;
        Byte* order = across.order.data() + b * 32;
        int8_t* weights = across.weights.data() + b * half * 16;
        for (int k = 0; k < block; ++k) {
            const int i = sampleOf(axis, b * block + k);
            const int at = axis.start[static_cast<size_t>(i)] - low;
            const int16_t* w = weightsOf(axis, i);
            const int whole = wholeTap(w, axis.taps);
            for (int which = 0; which < 2; ++which) {
                order[which * 16 + 2 * k] = static_cast<Byte>(at);
                order[which * 16 + 2 * k + 1] = static_cast<Byte>(at + half);
            }
            if (whole >= 0) {
                const auto centre = static_cast<Byte>(at + (whole >= half ? half : 0));
                order[16 + 2 * k] = order[16 + 2 * k + 1] = centre;
                weights[(half - 1) * 16 + 2 * k] = weights[(half - 1) * 16 + 2 * k + 1] = unity / 2;
                continue;
            }
            for (int t = 0; t < half; ++t) {
                weights[t * 16 + 2 * k] = static_cast<int8_t>(w[t]);
                weights[t * 16 + 2 * k + 1] = static_cast<int8_t>(w[t + half]);
            }
        }
    }
}

bool fitsRuns(const Axis& axis) {
    for (int i = 0; i < axis.target; ++i) {
        const int16_t* w = weightsOf(axis, i);
        for (int t = 0; t < axis.taps; t += 2)
            if (!byteFits(w[t]) || !byteFits(w[t + 1]) || !pairFits(w[t], w[t + 1])) return false;
    }
    return true;
}

void makeRuns(const Axis& axis, Across& across) {
    const int room = (axis.taps + 15) / 16 * 16;
    across.base = axis.start;
    across.weights.resize(static_cast<size_t>(axis.target) * static_cast<size_t>(room));
    for (int i = 0; i < axis.target; ++i)
        std::copy_n(weightsOf(axis, i), axis.taps, across.weights.begin() + static_cast<long>(i) * room);
}

}  // namespace

Across makeAcross(const Axis& axis) {
    Across across;
    across.target = axis.target;
    across.source = axis.source;
    across.taps = axis.taps;
    across.offset = axis.offset;
    if (axis.copies) return across;
    if (axis.taps > 1 && fitsBlocks(axis)) {
        across.form = Across::blocks;
        makeBlocks(axis, across);
    } else if (axis.taps > 1 && fitsRuns(axis)) {
        across.form = Across::runs;
        makeRuns(axis, across);
    } else {
        across.form = Across::plain;
        across.base = axis.start;
        across.words = axis.weights;
    }
    return across;
}

void padLine(Byte* to, const Byte* from, int n) {
    std::memset(to - beforeLine, from[0], beforeLine);
    std::memcpy(to, from, static_cast<size_t>(n));
    std::memset(to + n, from[n - 1], behindLine);
}

}  // namespace srk
