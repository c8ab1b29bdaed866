// The filter of eight taps: a low pass for each 1/32 of the scale ratio.
#include <algorithm>
#include <cmath>
#include <numbers>

#include "builtin/kernels/scale/axis.h"

namespace srk {

namespace {

using Taps = std::array<double, 8>;

// Phases 0, 1/4 and 1/2.
struct Row {
    Taps set[3];
};
constexpr int rowCount = 33;
using Table = std::array<Row, rowCount>;

constexpr double phaseOf[3] = {0, 0.25, 0.5};

// The two rows that the others are led through: half size, and no reduction.
constexpr int halfRow = 15, fullRow = 32;
constexpr Row half = {{{-4, 0, 36, 64, 36, 0, -4, 0},
                       {-2.695, -3.5768, 24.8137, 62.0967, 46.9132, 6.0814, -5.0319, -0.6013},
                       {-1.465, -5.0818, 14.5151, 56.0317, 56.0317, 14.5151, -5.0818, -1.465}}};
constexpr Row full = {{{0, 0, 0, 128, 0, 0, 0, 0},
                       {-1.7933, 6.4559, -18.7966, 114.3066, 35.7942, -10.9354, 3.4907, -0.5221},
                       {-1.5643, 6.8144, -20.2085, 78.9584, 78.9584, -20.2085, 6.8144, -1.5643}}};

double sinc(double x) {
    const double t = std::numbers::pi * x;
    return std::abs(t) < 1e-9 ? 1 : std::sin(t) / t;
}

void normalise(Taps& taps) {
    double sum = 0;
    for (const double tap : taps) sum += tap;
    for (double& tap : taps) tap *= unity / sum;
}

// A windowed sinc of this cutoff, in source samples. Eight taps can't hold the low pass of a strong
// reduction, for which a mean of all of them is the best: below half size the filter turns into that.
Taps lowPass(int row, double phase) {
    const double cutoff = std::min((row + 1) / 32.0, 1.0);
    const double below = std::max(0.0, (halfRow - row) / static_cast<double>(halfRow));
    const double flat = below * below;
    Taps taps{};
    for (int i = 0; i < 8; ++i) {
        const double x = i - 3 - phase;
        taps[static_cast<unsigned>(i)] = std::abs(x) < 4 ? sinc(cutoff * x) * sinc(x / 4) : 0;
    }
    normalise(taps);
    for (double& tap : taps) tap += flat * (unity / 8.0 - tap);
    return taps;
}

Table makeTable() {
    Table table;
    for (int row = 0; row < rowCount; ++row) {
        // How much of the two rows' distance from the low pass this row takes.
        const double toFull = std::clamp((row - halfRow) / static_cast<double>(fullRow - halfRow), 0.0, 1.0);
        const double toHalf = row <= halfRow ? row / static_cast<double>(halfRow) : 1 - toFull;
        for (int s = 0; s < 3; ++s) {
            Taps taps = lowPass(row, phaseOf[s]);
            const Taps atHalf = lowPass(halfRow, phaseOf[s]), atFull = lowPass(fullRow, phaseOf[s]);
            for (unsigned i = 0; i < 8; ++i)
                taps[i] += toHalf * (half.set[s][i] - atHalf[i]) + toFull * (full.set[s][i] - atFull[i]);
            table[static_cast<unsigned>(row)].set[s] = taps;
        }
    }
    return table;
}

Taps mirrored(const Taps& taps) {
    Taps out = taps;
    std::reverse(out.begin(), out.end());
    return out;
}

Taps between(const Taps& a, const Taps& b) {
    Taps out;
    for (unsigned i = 0; i < 8; ++i) out[i] = (a[i] + b[i]) / 2;
    return out;
}

}  // namespace

SincPhases sincPhases(double ratio) {
    static const Table table = makeTable();
    const double x = std::max(std::min(ratio, 1.03125) * 32 - 1, 0.0);
    const int i = std::min(static_cast<int>(x), rowCount - 1);
    const double f = x - i;
    const Row& row = table[static_cast<unsigned>(i)];
    const Row& next = table[static_cast<unsigned>(std::min(i + 1, rowCount - 1))];
    SincPhases phases;
    for (unsigned s = 0; s < 3; ++s) {
        Taps& taps = phases[2 * s];
        for (unsigned k = 0; k < 8; ++k)
            taps[k] = ((next.set[s][k] - row.set[s][k]) * f + row.set[s][k]) * 1.0009765625;
        normalise(taps);
    }
    phases[6] = mirrored(phases[2]);
    phases[8] = mirrored(phases[0]);
    for (unsigned odd = 1; odd < 9; odd += 2) phases[odd] = between(phases[odd - 1], phases[odd + 1]);
    return phases;
}

}  // namespace srk
