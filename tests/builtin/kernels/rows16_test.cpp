// Deep lines: every vector unit of the machine gives the bytes of the plain loops.
#include "builtin/kernels/rows16.h"

#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <vector>

#include "builtin/kernels/deep.h"
#include "builtin/kernels/scale8.h"
#include "tests/builtin/kernels/units.h"

using namespace srk;

namespace {

constexpr FloatScale scales[4] = {{0, 65535}, {32768, 57344}, {4096, 56064}, {0, 65535}};

template <int taps, class T>
void down(const LineCase& l, const float* weights) {
    const T* lines[taps];
    for (int t = 0; t < taps; ++t) lines[t] = reinterpret_cast<const T*>(l.in[t % 4]);
    deepDown(lines, weights, taps, l.wordsOut(0), l.n);
}

void matrix(const LineCase& l, const Deep& deep, bool lumaAlone = false) {
    const uint16_t* const from[3] = {l.words(0), l.words(1), l.words(2)};
    uint16_t* const to[3] = {l.wordsOut(0), lumaAlone ? nullptr : l.wordsOut(1), l.wordsOut(2)};
    deepMatrix(deep, from, to, l.n);
}

// Random floats are of any size, and not numbers among them: these are near the range of samples.
void nearFloats(const LineCase& l, float to) {
    for (size_t i = 0; i < 4 * l.n; ++i) {
        uint32_t bits;
        std::memcpy(&bits, l.in[0] + 4 * i, 4);
        if (bits % 16 < 2) continue;
        const float value = (static_cast<float>(bits) / 4294967296.0f * 1.4f - 0.2f) * to;
        std::memcpy(l.in[0] + 4 * i, &value, 4);
    }
}

constexpr float four4[] = {-0.1f, 0.6f, 0.55f, -0.05f}, two2[] = {0.25f, 0.75f}, one1[] = {1};
constexpr float six6[] = {0.01f, -0.09f, 0.7f, 0.5f, -0.1f, -0.02f};

const LineKernel kernels[] = {
    {"split four",
     {eight},
     {word, word, word, word},
     [](const LineCase& l) {
         splitWords4(l.in[0], l.wordsOut(0), l.wordsOut(1), l.wordsOut(2), l.wordsOut(3), l.n);
     }},
    {"split three of four",
     {eight},
     {word, word, word},
     [](const LineCase& l) {
         splitWords4(l.in[0], l.wordsOut(0), l.wordsOut(1), l.wordsOut(2), nullptr, l.n);
     }},
    {"join four",
     {word, word, word, word},
     {eight},
     [](const LineCase& l) { joinWords4(l.out[0], l.words(0), l.words(1), l.words(2), l.words(3), l.n); }},
    {"join opaque",
     {word, word, word},
     {eight},
     [](const LineCase& l) { joinWords4(l.out[0], l.words(0), l.words(1), l.words(2), nullptr, l.n); }},
    {"split Y216",
     {four},
     {word, halfWord, halfWord},
     [](const LineCase& l) {
         splitWords422(l.in[0], l.wordsOut(0), l.wordsOut(1), l.wordsOut(2), l.n, true);
     }},
    {"split v216",
     {four},
     {word, halfWord, halfWord},
     [](const LineCase& l) {
         splitWords422(l.in[0], l.wordsOut(0), l.wordsOut(1), l.wordsOut(2), l.n, false);
     }},
    {"join Y210",
     {word, halfWord, halfWord},
     {four},
     [](const LineCase& l) { joinWords422(l.out[0], l.words(0), l.words(1), l.words(2), l.n, true, true); }},
    {"join v216",
     {word, halfWord, halfWord},
     {four},
     [](const LineCase& l) {
         joinWords422(l.out[0], l.words(0), l.words(1), l.words(2), l.n, false, false);
     }},
    {"split pairs",
     {four},
     {word, word},
     [](const LineCase& l) { splitWords2(l.in[0], l.wordsOut(0), l.wordsOut(1), l.n); }},
    {"join pairs",
     {word, word},
     {four},
     [](const LineCase& l) { joinWords2(l.out[0], l.words(0), l.words(1), l.n, true); }},
    {"raise 9", {twoBytes}, {word}, [](const LineCase& l) { raiseWords(l.wordsOut(0), l.in[0], l.n, 9); }},
    {"raise 16", {twoBytes}, {word}, [](const LineCase& l) { raiseWords(l.wordsOut(0), l.in[0], l.n, 16); }},
    {"lower 10", {word}, {twoBytes}, [](const LineCase& l) { lowerWords(l.out[0], l.words(0), l.n, 10); }},
    {"lower 16", {word}, {twoBytes}, [](const LineCase& l) { lowerWords(l.out[0], l.words(0), l.n, 16); }},
    {"round", {word}, {twoBytes}, [](const LineCase& l) { roundWords(l.out[0], l.words(0), l.n, true); }},
    {"split v210",
     {v210Groups},
     {word, halfWord, halfWord},
     [](const LineCase& l) { splitV210(l.in[0], l.wordsOut(0), l.wordsOut(1), l.wordsOut(2), l.n); }},
    {"join v210",
     {word, halfWord, halfWord},
     {v210Groups},
     [](const LineCase& l) { joinV210(l.out[0], l.words(0), l.words(1), l.words(2), l.n); }},
    {"split v410",
     {four},
     {word, word, word},
     [](const LineCase& l) {
         splitTens(l.in[0], l.wordsOut(0), l.wordsOut(1), l.wordsOut(2), nullptr, l.n, 2);
     }},
    {"split Y410",
     {four},
     {word, word, word, word},
     [](const LineCase& l) {
         splitTens(l.in[0], l.wordsOut(0), l.wordsOut(1), l.wordsOut(2), l.wordsOut(3), l.n, 0);
     }},
    {"join v410",
     {word, word, word},
     {four},
     [](const LineCase& l) { joinTens(l.out[0], l.words(0), l.words(1), l.words(2), nullptr, l.n, 2); }},
    {"join Y410",
     {word, word, word, word},
     {four},
     [](const LineCase& l) { joinTens(l.out[0], l.words(0), l.words(1), l.words(2), l.words(3), l.n, 0); }},
    {"join Y410 opaque",
     {word, word, word},
     {four},
     [](const LineCase& l) { joinTens(l.out[0], l.words(0), l.words(1), l.words(2), nullptr, l.n, 0); }},
    {"split floats",
     {sixteen},
     {word, word, word, word},
     [](const LineCase& l) {
         nearFloats(l, 1);
         uint16_t* const planes[4] = {l.wordsOut(0), l.wordsOut(1), l.wordsOut(2), l.wordsOut(3)};
         splitFloats(l.in[0], planes, scales, l.n);
     }},
    {"join floats",
     {word, word, word},
     {sixteen},
     [](const LineCase& l) {
         const uint16_t* const planes[4] = {l.words(0), l.words(1), l.words(2), nullptr};
         joinFloats(l.out[0], planes, scales, l.n);
     }},
    {"down, 4 lines",
     {word, word, word, word},
     {word},
     [](const LineCase& l) { down<4, uint16_t>(l, four4); }},
    {"down, 6 lines",
     {word, word, word, word},
     {word},
     [](const LineCase& l) { down<6, uint16_t>(l, six6); }},
    {"down, 2 lines",
     {word, word, word, word},
     {word},
     [](const LineCase& l) { down<2, uint16_t>(l, two2); },
     true},
    {"down, a line of floats",
     {{16, 1, 4}},
     {{8, 1, 2}},
     [](const LineCase& l) {
         nearFloats(l, 65535);
         const float* const line = reinterpret_cast<const float*>(l.in[0]);
         for (size_t i = 0; i < 4 * l.n; ++i)
             if (!(std::abs(line[i]) < 1e6f)) std::memset(l.in[0] + 4 * i, 0, 4);
         deepDown(&line, one1, 1, l.wordsOut(0), 4 * l.n);
     }},
    {"RGB to YUV",
     {word, word, word},
     {word, word, word},
     [](const LineCase& l) { matrix(l, deepToYuv(Matrix::bt709, false)); }},
    {"RGB to luma",
     {word, word, word},
     {word},
     [](const LineCase& l) { matrix(l, deepToYuv(Matrix::bt601, true), true); },
     true},
    {"YUV to RGB",
     {word, word, word},
     {word, word, word},
     [](const LineCase& l) { matrix(l, deepToRgb(Matrix::bt601, false)); },
     true},
    {"YUV to other",
     {word, word, word},
     {word, word, word},
     [](const LineCase& l) { matrix(l, deepToOther(Matrix::bt601)); }},
    {"levels",
     {word, word, word},
     {word, word, word},
     [](const LineCase& l) { matrix(l, deepLevels(false)); }},
    {"twice", {word}, {{4, 1, 2}}, [](const LineCase& l) { twice(l.wordsOut(0), l.words(0), l.n); }},
    {"double", {halfWord}, {word}, [](const LineCase& l) { doubleLine(l.wordsOut(0), l.words(0), l.n); }},
    {"evens", {{4, 1, 2}}, {word}, [](const LineCase& l) { evens(l.wordsOut(0), l.words(0), l.n); }},
};

struct Geometry {
    int source, target;
    Mapping mapping;
};
// Blocks whose samples lie within one vector, within two, or apart; mirrored; outside of the line.
constexpr Geometry geometries[] = {
    {40, 129, {-0.345, 0.31}}, {129, 86, {0.25, 1.5}}, {400, 66, {2.5, 6.06}},
    {65, 65, {64, -1}},        {50, 40, {-20, 3}},     {279, 69, {1.5, 4}},
    {1, 5, {-0.4, 0.2}},       {33, 33, {0, 1}},       {90, 45, {0.5, 2}},
};

}  // namespace

TEST(Rows16, UnitsGiveTheBytesOfThePlainLoops) { compareUnits(kernels); }

TEST(Rows16, LinesAreScaledAcrossAlikeAndNearTheExactSum) {
    for (const auto& g : geometries)
        for (const auto filter : {Filter::nearest, Filter::linear, Filter::cubic, Filter::sinc}) {
            const Axis axis = makeAxis(g.mapping, g.source, g.target, filter, true);
            const DeepAcross across = makeDeepAcross(axis);
            const auto source = static_cast<size_t>(g.source), target = static_cast<size_t>(g.target);
            std::vector<uint16_t> line(source);
            for (size_t i = 0; i < source; ++i) line[i] = static_cast<uint16_t>(i * i * 2654435761u >> 7);
            std::vector<float> expected;
            for (const auto unit : machineTargets()) {
                std::vector<float> padded(source + beforeLine + behindLine), to(target + 1, 7);
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

TEST(Rows16, UnitsOfTheMachineReallyRun) {
    for (const auto target : machineTargets()) {
        const OnTarget only(target);
        EXPECT_STREQ(rows16Unit(), hwy::TargetName(target));
        EXPECT_STREQ(deepUnit(), hwy::TargetName(target));
    }
}
