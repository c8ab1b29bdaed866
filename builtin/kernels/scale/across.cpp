// Turns positions and weights into what the pass across reads.
#include <algorithm>
#include <cstring>

#include "builtin/kernels/scale/scale8.h"

namespace srk {

namespace {

constexpr int block = 8;

// The sample of a block that stands in for those past the end of the line.
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

// The first source sample of a block, and how many samples all of its pairs span; 0 if its weights do not
// fit.
struct Reach {
    int low, span;
};

Reach reachOf(const Axis& axis, int first) {
    int low = axis.start[static_cast<size_t>(sampleOf(axis, first))], high = low;
    for (int k = 1; k < block; ++k) {
        const int start = axis.start[static_cast<size_t>(sampleOf(axis, first + k))];
        low = std::min(low, start);
        high = std::max(high, start);
    }
    return {low, high - low + axis.taps / 2 + 1};
}

bool weightsFitBlocks(const Axis& axis) {
    const int half = axis.taps / 2;
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

constexpr int window = 16;

// 16-byte windows that the blocks of an axis take: 1, 2, or 0 for more.
int windowsOf(const Axis& axis) {
    if (!weightsFitBlocks(axis)) return 0;
    int windows = 1;
    for (int first = 0; first < axis.target; first += block) {
        const int span = reachOf(axis, first).span;
        if (span > 2 * window) return 0;
        if (span > window) windows = 2;
    }
    return windows;
}

// A byte that a window does not hold picks nothing.
Byte orderOf(int at, int which) {
    const int inside = at - which * window;
    return inside < 0 || inside >= window ? Byte{0x80} : static_cast<Byte>(inside);
}

// Tables lie so that two blocks are read at once: order[pairs or centre][window][block][16] and
// weights[tap][block][16].
void makeBlocks(const Axis& axis, Across& across, int windows) {
    const int half = axis.taps / 2, doubles = (axis.target + 2 * block - 1) / (2 * block);
    across.form = windows == 1 ? Across::blocks : Across::wide;
    across.base.resize(static_cast<size_t>(doubles) * 2);
    across.order.resize(static_cast<size_t>(doubles * windows) * 64);
    across.weights.resize(static_cast<size_t>(doubles * half) * 32);
    for (int b = 0; b < 2 * doubles; ++b) {
        const int low = reachOf(axis, b * block).low;
        across.base[static_cast<size_t>(b)] = low;
        Byte* order = across.order.data() + b / 2 * windows * 64 + b % 2 * 16;
        int8_t* weights = across.weights.data() + b / 2 * half * 32 + b % 2 * 16;
        for (int k = 0; k < block; ++k) {
            const int i = sampleOf(axis, b * block + k);
            const int at = axis.start[static_cast<size_t>(i)] - low;
            const int16_t* w = weightsOf(axis, i);
            const int whole = wholeTap(w, axis.taps);
            const int centre = whole >= half ? half : 0;
            for (int which = 0; which < windows; ++which) {
                Byte* all = order + which * 32 + 2 * k;
                Byte* middle = all + windows * 32;
                all[0] = orderOf(at, which);
                all[1] = orderOf(at + half, which);
                middle[0] = whole >= 0 ? orderOf(at + centre, which) : all[0];
                middle[1] = whole >= 0 ? orderOf(at + centre, which) : all[1];
            }
            if (whole >= 0) {
                weights[(half - 1) * 32 + 2 * k] = weights[(half - 1) * 32 + 2 * k + 1] = unity / 2;
                continue;
            }
            for (int t = 0; t < half; ++t) {
                weights[t * 32 + 2 * k] = static_cast<int8_t>(w[t]);
                weights[t * 32 + 2 * k + 1] = static_cast<int8_t>(w[t + half]);
            }
        }
    }
}

bool isHalves(const Axis& axis) {
    constexpr int16_t expected[4] = {32, 64, 32, 0};
    if (axis.taps != 4) return false;
    for (int i = 0; i < axis.target; ++i)
        if (axis.start[static_cast<size_t>(i)] != 2 * i - 1 ||
            !std::equal(expected, expected + 4, weightsOf(axis, i)))
            return false;
    return true;
}

// Samples four apart whose eight weights are the same for all.
bool isQuarters(const Axis& axis) {
    if (axis.taps != 8) return false;
    const int16_t* w = axis.weights.data();
    for (int t = 0; t < 4; ++t)
        if (!byteFits(w[t]) || !byteFits(w[t + 4]) || !pairFits(w[t], w[t + 4])) return false;
    for (int i = 0; i < axis.target; ++i)
        if (axis.start[static_cast<size_t>(i)] != axis.start[0] + 4 * i ||
            !std::equal(w, w + 8, weightsOf(axis, i)))
            return false;
    return true;
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
    across.base = axis.start;
    across.weights.resize(axis.weights.size());
    std::transform(axis.weights.begin(), axis.weights.end(), across.weights.begin(),
                   [](int16_t weight) { return static_cast<int8_t>(weight); });
}

}  // namespace

Across makeAcross(const Axis& axis) {
    Across across;
    across.target = axis.target;
    across.source = axis.source;
    across.taps = axis.taps;
    across.offset = axis.offset;
    if (axis.copies) return across;
    const int windows = axis.taps > 1 ? windowsOf(axis) : 0;
    if (isHalves(axis)) {
        across.form = Across::halves;
    } else if (isQuarters(axis)) {
        across.form = Across::quarters;
        makeRuns(axis, across);
    } else if (windows) {
        makeBlocks(axis, across, windows);
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

std::vector<int8_t> downBytesWeights(const Axis& axis) {
    if (axis.copies || axis.taps < 2 || !weightsFitBlocks(axis)) return {};
    const int half = axis.taps / 2;
    std::vector<int8_t> weights(axis.weights.size());
    int8_t* to = weights.data();
    for (int i = 0; i < axis.target; ++i)
        for (int t = 0; t < half; ++t)
            for (const int tap : {t, t + half}) {
                const int weight = weightsOf(axis, i)[tap];
                *to++ = static_cast<int8_t>(weight == unity ? 0 : weight);
            }
    return weights;
}

void padLine(Byte* to, const Byte* from, int n) {
    std::memset(to - beforeLine, from[0], beforeLine);
    std::memcpy(to, from, static_cast<size_t>(n));
    std::memset(to + n, from[n - 1], afterLine);
}

}  // namespace srk
