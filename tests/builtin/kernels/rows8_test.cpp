// Every vector unit of the machine gives the bytes of the plain loops, and touches nothing else.
#include "builtin/kernels/rows8.h"

#include <gtest/gtest.h>

#include <cmath>

#include "builtin/kernels/rgbchroma.h"
#include "builtin/kernels/yuvrgb.h"
#include "tests/builtin/kernels/units.h"

using namespace srk;

namespace {

constexpr Matrix b601 = Matrix::bt601, b709 = Matrix::bt709;

void chromaOf(const LineCase& l, const Byte (&weights)[4], bool filtered) {
    const Byte* const lines[4] = {l.in[0], l.in[1], l.in[2], l.in[3]};
    rgb4ToChroma(toYuv(b601, false), lines, weights, filtered, l.out[0], l.out[1], l.n);
}

const LineKernel kernels[] = {
    {"split4",
     {four},
     {one, one, one, one},
     [](const LineCase& l) { split4(l.in[0], l.out[0], l.out[1], l.out[2], l.out[3], l.n); }},
    {"split4 of three",
     {four},
     {one, one, one},
     [](const LineCase& l) { split4(l.in[0], l.out[0], l.out[1], l.out[2], nullptr, l.n); }},
    {"join4",
     {one, one, one, one},
     {four},
     [](const LineCase& l) { join4(l.out[0], l.in[0], l.in[1], l.in[2], l.in[3], l.n); }},
    {"join4 opaque",
     {one, one, one},
     {four},
     [](const LineCase& l) { join4(l.out[0], l.in[0], l.in[1], l.in[2], nullptr, l.n); }},
    {"split3",
     {three},
     {one, one, one},
     [](const LineCase& l) { split3(l.in[0], l.out[0], l.out[1], l.out[2], l.n); }},
    {"join3",
     {one, one, one},
     {three},
     [](const LineCase& l) { join3(l.out[0], l.in[0], l.in[1], l.in[2], l.n); }},
    {"pack4to3", {four}, {three}, [](const LineCase& l) { pack4to3(l.out[0], l.in[0], l.n); }},
    {"pack3to4", {three}, {four}, [](const LineCase& l) { pack3to4(l.out[0], l.in[0], l.n); }},
    {"split565",
     {twoBytes},
     {one, one, one},
     [](const LineCase& l) { split565(l.in[0], l.out[0], l.out[1], l.out[2], l.n, true); }},
    {"split555",
     {twoBytes},
     {one, one, one},
     [](const LineCase& l) { split565(l.in[0], l.out[0], l.out[1], l.out[2], l.n, false); }},
    {"join565",
     {one, one, one},
     {twoBytes},
     [](const LineCase& l) { join565(l.out[0], l.in[0], l.in[1], l.in[2], l.n, true); }},
    {"join555",
     {one, one, one},
     {twoBytes},
     [](const LineCase& l) { join565(l.out[0], l.in[0], l.in[1], l.in[2], l.n, false); }},
    {"luma alone",
     {one, one, one},
     {one},
     [](const LineCase& l) {
         rgbToYuv(toYuv(b601, false), l.in[0], l.in[1], l.in[2], l.out[0], nullptr, nullptr, l.n);
     }},
    {"split YUYV",
     {twoBytes},
     {one, half, half},
     [](const LineCase& l) { splitYuyv(l.in[0], l.out[0], l.out[1], l.out[2], l.n, true); }},
    {"split UYVY",
     {twoBytes},
     {one, half, half},
     [](const LineCase& l) { splitYuyv(l.in[0], l.out[0], l.out[1], l.out[2], l.n, false); }},
    {"join YUYV",
     {one, half, half},
     {twoBytes},
     [](const LineCase& l) { joinYuyv(l.out[0], l.in[0], l.in[1], l.in[2], l.n, true); }},
    {"join UYVY",
     {one, half, half},
     {twoBytes},
     [](const LineCase& l) { joinYuyv(l.out[0], l.in[0], l.in[1], l.in[2], l.n, false); }},
    {"rgb4ToYuv",
     {four},
     {one, one, one},
     [](const LineCase& l) { rgb4ToYuv(toYuv(b601, false), l.in[0], l.out[0], l.out[1], l.out[2], l.n); }},
    {"rgb4ToYuv video",
     {four},
     {one, one, one},
     [](const LineCase& l) { rgb4ToYuv(toYuv(b709, true), l.in[0], l.out[0], l.out[1], l.out[2], l.n); }},
    {"rgbToYuv",
     {one, one, one},
     {one, one, one},
     [](const LineCase& l) {
         rgbToYuv(toYuv(b709, false), l.in[0], l.in[1], l.in[2], l.out[0], l.out[1], l.out[2], l.n);
     },
     true},
    {"yuvToRgb",
     {one, one, one},
     {one, one, one},
     [](const LineCase& l) {
         yuvToRgb(toRgb(b601, false), l.in[0], l.in[1], l.in[2], l.out[0], l.out[1], l.out[2], l.n);
     },
     true},
    {"yuvToRgb4",
     {one, one, one},
     {four},
     [](const LineCase& l) {
         yuvToRgb4(toRgb(b709, false), l.in[0], l.in[1], l.in[2], l.out[0], l.n, false);
     }},
    {"yuvToRgb3 video",
     {one, one, one},
     {three},
     [](const LineCase& l) {
         yuvToRgb3(toRgb(b709, true), l.in[0], l.in[1], l.in[2], l.out[0], l.n, false);
     }},
    {"yuvToRgb4, chroma repeated",
     {one, half, half},
     {four},
     [](const LineCase& l) {
         if (l.n > 1) yuvToRgb4(toRgb(b601, false), l.in[0], l.in[1], l.in[2], l.out[0], l.n, true);
     }},
    {"yuvToOther",
     {one, one, one},
     {one, one, one},
     [](const LineCase& l) {
         for (int i = 0; i < 3; ++i) std::memmove(l.out[i], l.in[i], l.n);
         yuvToOther(toOther(b709), l.out[0], l.out[1], l.out[2], l.n);
     }},
    {"toVideoLevels", {one}, {one}, [](const LineCase& l) { toVideoLevels(l.out[0], l.in[0], l.n); }, true},
    {"toFullLevels", {one}, {one}, [](const LineCase& l) { toFullLevels(l.out[0], l.in[0], l.n); }, true},
    {"widen",
     {one},
     {word},
     [](const LineCase& l) { widen(reinterpret_cast<uint16_t*>(l.out[0]), l.in[0], l.n, false); }},
    {"widen full",
     {one},
     {word},
     [](const LineCase& l) { widen(reinterpret_cast<uint16_t*>(l.out[0]), l.in[0], l.n, true); }},
    {"narrow", {word}, {one}, [](const LineCase& l) { narrow(l.out[0], l.words(0), l.n, false); }},
    {"narrow full", {word}, {one}, [](const LineCase& l) { narrow(l.out[0], l.words(0), l.n, true); }},
    {"twice", {one}, {twoBytes}, [](const LineCase& l) { twice(l.out[0], l.in[0], l.n); }},
    {"evens", {twoBytes}, {one}, [](const LineCase& l) { evens(l.out[0], l.in[0], l.n); }},
    {"doubleLine", {half}, {one}, [](const LineCase& l) { doubleLine(l.out[0], l.in[0], l.n); }},
    {"rgb4ToLuma",
     {four},
     {one},
     [](const LineCase& l) { rgb4ToLuma(toYuv(b709, false), l.in[0], l.out[0], l.n); }},
    {"rgb4ToChroma",
     {four, four, four, four},
     {half, half},
     [](const LineCase& l) {
         chromaOf(l, {2, 6, 6, 2}, true);
     }},
    {"rgb4ToChroma of a line",
     {four, four, four, four},
     {half, half},
     [](const LineCase& l) {
         chromaOf(l, {chromaUnity, 0, 0, 0}, true);
     }},
    {"rgb4ToChroma of single pixels",
     {four, four, four, four},
     {half, half},
     [](const LineCase& l) {
         chromaOf(l, {1, 5, 7, 3}, false);
     }},
    {"rgb4ToChroma of a line's single pixels",
     {four, four, four, four},
     {half, half},
     [](const LineCase& l) {
         chromaOf(l, {chromaUnity, 0, 0, 0}, false);
     }},
};

}  // namespace

TEST(Rows8, UnitsGiveTheBytesOfThePlainLoops) { compareUnits(kernels); }

TEST(Rows8, UnitsOfTheMachineReallyRun) {
    for (const auto target : machineTargets()) {
        const OnTarget only(target);
        EXPECT_STREQ(rows8Unit(), hwy::TargetName(target));
        EXPECT_STREQ(rgbChromaUnit(), hwy::TargetName(target));
        EXPECT_STREQ(yuvRgbUnit(), hwy::TargetName(target));
    }
}

TEST(Rows8, MatricesStayNearTheExactFormula) {
    // Full levels to BT.601, with the weights of the standard.
    double worst = 0;
    for (int r = 0; r < 256; r += 3)
        for (int g = 0; g < 256; g += 5)
            for (int b = 0; b < 256; b += 3) {
                const Byte pixel[4] = {static_cast<Byte>(b), static_cast<Byte>(g), static_cast<Byte>(r), 0};
                Byte y, u, v;
                rgb4ToYuv(toYuv(b601, false), pixel, &y, &u, &v, 1);
                const double luma = 0.299 * r + 0.587 * g + 0.114 * b;
                const double expected[3] = {16 + luma * 219 / 255, 128 + (b - luma) / 1.772 * 224 / 255,
                                            128 + (r - luma) / 1.402 * 224 / 255};
                worst = std::max(
                    {worst, std::abs(y - expected[0]), std::abs(u - expected[1]), std::abs(v - expected[2])});
                Byte back[4];
                yuvToRgb4(toRgb(b601, false), &y, &u, &v, back, 1, false);
                const double exact = (19077.0 * (y - 16) + 26153.0 * (v - 128)) / 16384;
                ASSERT_LE(std::abs(back[2] - std::clamp(exact, 0.0, 255.0)), 0.6);
                for (int i = 0; i < 3; ++i)
                    ASSERT_LE(std::abs(back[i] - pixel[i]), 2) << r << ' ' << g << ' ' << b;
            }
    EXPECT_LE(worst, 0.62);
}

TEST(Rows8, GreyHasNoColourAndLevelsMeetTheirEnds) {
    for (const Matrix matrix : {b601, b709})
        for (const bool video : {false, true})
            for (int grey = video ? 16 : 0; grey <= (video ? 235 : 255); ++grey) {
                const Byte pixel[4] = {static_cast<Byte>(grey), static_cast<Byte>(grey),
                                       static_cast<Byte>(grey), 9};
                Byte y, u, v, back[4];
                rgb4ToYuv(toYuv(matrix, video), pixel, &y, &u, &v, 1);
                ASSERT_EQ(u, 128);
                ASSERT_EQ(v, 128);
                yuvToRgb4(toRgb(matrix, video), &y, &u, &v, back, 1, false);
                ASSERT_LE(std::abs(back[1] - grey), 1);
                if (grey == (video ? 235 : 255)) {
                    EXPECT_EQ(y, 235);
                    EXPECT_EQ(back[0], grey);
                }
            }
}
