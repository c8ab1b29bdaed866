// The filters, and both passes of scaling on every vector unit.
#include "builtin/kernels/scale/scale8.h"

#include <cmath>
#include <numeric>

#include "builtin/kernels/scale/deep.h"
#include "tests/support/line_kernels.h"

using namespace srk;

namespace {

Mapping centred(int source, int target) {
    const double step = static_cast<double>(source) / target;
    return {(step - 1) / 2, step};
}

constexpr Filter filters[] = {Filter::nearest, Filter::linear, Filter::cubic, Filter::sinc};

// Ratios that use each form of the pass across, in both directions, mirrored, and with positions outside.
struct Geometry {
    int source, target;
    Mapping mapping;
};
const Geometry geometries[] = {
    {1, 5, centred(1, 5)},         {2, 7, centred(2, 7)},       {100, 67, centred(100, 67)},
    {64, 129, centred(64, 129)},   {129, 43, centred(129, 43)}, {1920, 31, centred(1920, 31)},
    {65, 65, {0.25, 1}},           {65, 65, {64, -1}},          {50, 40, {-20, 3}},
    {300, 200, centred(300, 200)}, {90, 45, centred(90, 45)},   {33, 33, {0, 1}},
    {279, 69, {1.5, 4}},           {276, 69, {0, 4}},           {40, 129, centred(40, 129)},
    {129, 86, {0.25, 1.5}},        {400, 66, {2.5, 6.06}},
};

std::vector<int16_t> across(const Across& table, Guarded& line, int64_t target) {
    std::vector<Byte> padded(static_cast<size_t>(beforeLine + table.source + afterLine));
    padLine(padded.data() + beforeLine, line.data(), table.source);
    std::vector<int16_t> words(static_cast<size_t>(table.target + wordBlock), 77);
    const OnTarget only(target);
    // A copy reads the line itself.
    scaleAcross(table, table.form == Across::copy ? line.data() : padded.data() + beforeLine, words.data());
    words.resize(static_cast<size_t>(table.target));
    return words;
}

}  // namespace

TEST(Axis, WeightsAddUpAndTheDesignedRowsAreMet) {
    for (const auto filter : filters)
        for (const auto& geometry : geometries) {
            const Axis axis = makeAxis(geometry.mapping, geometry.source, geometry.target, filter, false);
            for (int i = 0; i < axis.target && !axis.copies; ++i)
                ASSERT_EQ(std::accumulate(axis.weights.begin() + i * axis.taps,
                                          axis.weights.begin() + (i + 1) * axis.taps, 0),
                          unity);
        }
    const auto half = sincPhases(0.5);
    const double expected[8] = {-4, 0, 36, 64, 36, 0, -4, 0};
    for (unsigned i = 0; i < 8; ++i) EXPECT_NEAR(half[0][i], expected[i], 0.01);
    const auto full = sincPhases(2);
    EXPECT_NEAR(full[0][3], 128, 0.01);
    EXPECT_NEAR(full[2][3], 114.3066, 0.01);
    EXPECT_NEAR(full[4][3], 78.9584, 0.01);
    EXPECT_NEAR(full[8][4], 128, 0.01);
    const auto least = sincPhases(0.01);
    for (const double tap : least[4]) EXPECT_NEAR(tap, 16, 0.5);
    for (double ratio = 0.03; ratio < 1.2; ratio += 0.01)
        for (const auto& phase : sincPhases(ratio))
            EXPECT_NEAR(std::accumulate(phase.begin(), phase.end(), 0.0), 128, 1e-9);
}

TEST(Scale8, UnitsGiveTheBytesOfThePlainLoops) {
    for (const auto& geometry : geometries) {
        Guarded line(static_cast<size_t>(geometry.source), 5);
        for (const auto filter : filters) {
            const Axis axis = makeAxis(geometry.mapping, geometry.source, geometry.target, filter, false);
            const Across table = makeAcross(axis);
            const auto expected = across(table, line, HWY_STATIC_TARGET);
            for (int i = 0; i < axis.target && !axis.copies; ++i) {
                int sum = -16384;
                for (int t = 0; t < axis.taps; ++t)
                    sum +=
                        axis.weights[static_cast<size_t>(i * axis.taps + t)] *
                        line.data()[std::clamp(axis.start[static_cast<size_t>(i)] + t, 0, axis.source - 1)];
                ASSERT_EQ(expected[static_cast<size_t>(i)], sum)
                    << geometry.source << " to " << geometry.target << " form " << table.form;
            }
            for (const auto target : machineTargets())
                ASSERT_EQ(across(table, line, target), expected)
                    << geometry.source << " to " << geometry.target << " on " << hwy::TargetName(target)
                    << " form " << table.form;
        }
    }
}

TEST(Scale8, LinesAreAddedUpAlike) {
    constexpr int longest = 70;
    std::vector<int16_t> lines[20];
    const int16_t* starts[20];
    for (unsigned t = 0; t < 20; ++t) {
        Byte bytes[longest + wordBlock];
        fillBytes(bytes, sizeof bytes, t);
        for (const Byte byte : bytes) lines[t].push_back(static_cast<int16_t>(byte * 170 - 16384));
        starts[t] = lines[t].data();
    }
    for (const int taps : {1, 2, 4, 6, 8, 20}) {
        int16_t weights[20], left = unity;
        for (int t = 0; t + 1 < taps; ++t) {
            weights[t] = static_cast<int16_t>(t % 3 ? 40 / taps : -15);
            left = static_cast<int16_t>(left - weights[t]);
        }
        weights[taps - 1] = left;
        for (int n = 1; n <= longest; ++n) {
            std::string expected;
            for (const auto target : machineTargets()) {
                Guarded to(static_cast<size_t>(n), 9);
                const OnTarget only(target);
                scaleDown(starts, weights, taps, to.data(), n);
                if (expected.empty()) expected = to.bytes();
                ASSERT_EQ(to.bytes(), expected)
                    << taps << " taps, " << n << " on " << hwy::TargetName(target);
                EXPECT_TRUE(to.intact());
            }
        }
    }
}

TEST(Deep, LinesAreScaledAcrossAlikeAndNearTheExactSum) {
    for (const auto& g : geometries)
        for (const auto filter : filters) {
            const Axis axis = makeAxis(g.mapping, g.source, g.target, filter, true);
            const DeepAcross across = makeDeepAcross(axis);
            const auto source = static_cast<size_t>(g.source), target = static_cast<size_t>(g.target);
            std::vector<uint16_t> line(source);
            for (size_t i = 0; i < source; ++i) line[i] = static_cast<uint16_t>(i * i * 2654435761u >> 7);
            std::vector<float> expected;
            for (const auto unit : machineTargets()) {
                std::vector<float> padded(source + beforeLine + afterLine), to(target + 1, 7);
                const OnTarget only(unit);
                deepAcross(axis, across, line.data(), padded.data(), to.data());
                EXPECT_EQ(to[target], 7);
                if (expected.empty()) expected = to;
                ASSERT_EQ(to, expected) << g.source << " to " << g.target << " on " << hwy::TargetName(unit);
            }
            for (size_t i = 0; i < target && !axis.copies; ++i) {
                double sum = 0;
                for (int t = 0; t < axis.taps; ++t) {
                    const int at = std::clamp(axis.start[i] + t, 0, g.source - 1);
                    sum += static_cast<double>(
                               axis.exact[i * static_cast<size_t>(axis.taps) + static_cast<size_t>(t)]) *
                           line[static_cast<size_t>(at)];
                }
                ASSERT_NEAR(expected[i], sum, 0.05) << g.source << " to " << g.target << " at " << i;
            }
        }
}

TEST(Scale8, LinesOfBytesAreAddedUpAlike) {
    // Pairs of taps that lie half of the filter apart.
    const auto addedUp = [](const std::vector<int8_t>& weights) {
        const size_t half = weights.size() / 2;
        const auto run = [=](const LineCase& l) {
            const auto taps = static_cast<int>(weights.size());
            scaleDownBytes(l.in, weights.data(), taps, l.out[0], static_cast<int>(l.n));
        };
        return checked<Byte>(run, [=](const LineCase& l, size_t i) {
            int sum = 64;
            for (size_t t = 0; t < half; ++t)
                sum += weights[2 * t] * l.in[t][i] + weights[2 * t + 1] * l.in[t + half][i];
            return std::clamp(sum >> 7, 0, 255);
        });
    };
    const LineKernel kernels[] = {
        {"2 lines", {one, one}, {one}, addedUp({50, 78})},
        {"4 lines", {one, one, one, one}, {one}, addedUp({-10, 74, 74, -10})},
        {"6 lines", {one, one, one, one, one, one}, {one}, addedUp({3, 80, -19, -19, 80, 3})},
        {"8 lines",
         {one, one, one, one, one, one, one, one},
         {one},
         addedUp({-2, 79, 7, -20, -20, 7, 79, -2})},
    };
    compareUnits(kernels);
}
