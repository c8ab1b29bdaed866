// Deep lines: every vector unit of the machine gives the bytes of the plain loops.
#include "builtin/kernels/lines/rows16.h"

#include <cmath>
#include <cstdlib>

#include "builtin/kernels/scale/deep.h"
#include "tests/support/line_kernels.h"

using namespace srk;

namespace {

constexpr FloatScale scales[4] = {{0, 65535}, {32768, 57344}, {4096, 56064}, {0, 65535}};

auto down(const std::vector<float>& weights) {
    return [=](const LineCase& l) {
        const uint16_t* lines[8];
        for (int t = 0; t < 8; ++t) lines[t] = l.words(t);
        deepDown(lines, weights.data(), static_cast<int>(weights.size()), l.wordsOut(0), l.n);
    };
}

auto matrix(const Deep& deep) {
    return [=](const LineCase& l) {
        const uint16_t* const from[3] = {l.words(0), l.words(1), l.words(2)};
        uint16_t* const to[3] = {l.wordsOut(0), l.wordsOut(1), l.wordsOut(2)};
        deepMatrix(deep, from, to, l.n);
    };
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

const LineKernel kernels[] = {
    {"split four", {eight}, {word, word, word, word}, onLines(splitWords4)},
    {"split three of four", {eight}, {word, word, word}, onLines(splitWords4)},
    {"join four", {word, word, word, word}, {eight}, onLines(joinWords4)},
    {"join opaque", {word, word, word}, {eight}, onLines(joinWords4)},
    {"split Y216", {four}, {word, halfWord, halfWord}, onLines(splitWords422, true)},
    {"split v216", {four}, {word, halfWord, halfWord}, onLines(splitWords422, false)},
    {"join Y210", {word, halfWord, halfWord}, {four}, onLines(joinWords422, true)},
    {"join v216", {word, halfWord, halfWord}, {four}, onLines(joinWords422, false)},
    {"split pairs", {four}, {word, word}, onLines(splitWords2)},
    {"join pairs", {word, word}, {four}, onLines(joinWords2, true)},
    {"raise 9", {twoBytes}, {word}, onLines(raiseWords, 9)},
    {"raise 16", {twoBytes}, {word}, onLines(raiseWords, 16)},
    {"lower 10", {word}, {twoBytes}, onLines(lowerWords, 10)},
    {"lower 16", {word}, {twoBytes}, onLines(lowerWords, 16)},
    {"round", {word}, {twoBytes}, onLines(roundWords, true)},
    {"split v210", {v210Groups}, {word, halfWord, halfWord}, onLines(splitV210)},
    {"join v210", {word, halfWord, halfWord}, {v210Groups}, onLines(joinV210)},
    {"split v410", {four}, {word, word, word}, onLines(splitTens, 2)},
    {"split Y410", {four}, {word, word, word, word}, onLines(splitTens, 0)},
    {"join v410", {word, word, word}, {four}, onLines(joinTens, 2)},
    {"join Y410", {word, word, word, word}, {four}, onLines(joinTens, 0)},
    {"join Y410 opaque", {word, word, word}, {four}, onLines(joinTens, 0)},
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
    {"down, 4 lines", {word, word, word, word}, {word}, down({-0.1f, 0.6f, 0.55f, -0.05f})},
    {"down, 6 lines",
     {word, word, word, word, word, word},
     {word},
     down({0.01f, -0.09f, 0.7f, 0.5f, -0.1f, -0.02f})},
    {"down, 2 lines", {word, word}, {word}, down({0.25f, 0.75f}), true},
    {"down, a line of floats",
     {{16, 1, 4}},
     {{8, 1, 2}},
     [](const LineCase& l) {
         nearFloats(l, 65535);
         const float* const line = reinterpret_cast<const float*>(l.in[0]);
         for (size_t i = 0; i < 4 * l.n; ++i)
             if (!(std::abs(line[i]) < 1e6f)) std::memset(l.in[0] + 4 * i, 0, 4);
         constexpr float unchanged = 1;
         deepDown(&line, &unchanged, 1, l.wordsOut(0), 4 * l.n);
     }},
    {"RGB to YUV", {word, word, word}, {word, word, word}, matrix(deepToYuv(Matrix::bt709, false))},
    {"RGB to luma", {word, word, word}, {word}, matrix(deepToYuv(Matrix::bt601, true)), true},
    {"YUV to RGB", {word, word, word}, {word, word, word}, matrix(deepToRgb(Matrix::bt601, false)), true},
    {"YUV to other", {word, word, word}, {word, word, word}, matrix(deepToOther(Matrix::bt601))},
    {"levels", {word, word, word}, {word, word, word}, matrix(deepLevels(false))},
    {"twice", {word}, {{4, 1, 2}}, onLines(twice)},
    {"double", {halfWord}, {word}, onLines(doubleLine)},
    {"evens", {{4, 1, 2}}, {word}, onLines(evens)},
};

}  // namespace

TEST(Rows16, UnitsGiveTheBytesOfThePlainLoops) { compareUnits(kernels); }
