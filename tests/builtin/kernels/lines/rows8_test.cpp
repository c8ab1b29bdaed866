// Every vector unit of the machine gives the bytes of the plain loops, and touches nothing else.
#include "builtin/kernels/lines/rows8.h"

#include <array>
#include <cmath>

#include "builtin/kernels/lines/packedchroma.h"
#include "builtin/kernels/lines/rgbchroma.h"
#include "builtin/kernels/lines/yuvrgb.h"
#include "tests/support/line_kernels.h"

using namespace srk;

namespace {

constexpr Matrix b601 = Matrix::bt601, b709 = Matrix::bt709;

auto chroma(std::array<Byte, 4> weights, bool filtered) {
    return [=](const LineCase& l) {
        rgb4ToChroma(toYuv(b601, false), l.in, weights.data(), filtered, l.out[0], l.out[1], l.n);
    };
}

auto packedChroma(std::array<Byte, 4> weights, bool lumaFirst) {
    return [=](const LineCase& l) {
        packedToChroma(l.in, weights[0] ? weights.data() : nullptr, l.out[0], l.out[1], l.n, lumaFirst);
    };
}

const LineKernel kernels[] = {
    {"split4", {four}, {one, one, one, one}, onLines(split4)},
    {"split4 of three", {four}, {one, one, one}, onLines(split4)},
    {"join4", {one, one, one, one}, {four}, onLines(join4)},
    {"join4 opaque", {one, one, one}, {four}, onLines(join4)},
    {"split3", {three}, {one, one, one}, onLines(split3)},
    {"join3", {one, one, one}, {three}, onLines(join3)},
    {"pack4to3", {four}, {three}, onLines(pack4to3)},
    {"pack3to4", {three}, {four}, onLines(pack3to4)},
    {"split565", {twoBytes}, {one, one, one}, onLines(split565, true)},
    {"split555", {twoBytes}, {one, one, one}, onLines(split565, false)},
    {"join565", {one, one, one}, {twoBytes}, onLines(join565, true)},
    {"join555", {one, one, one}, {twoBytes}, onLines(join565, false)},
    {"luma alone", {one, one, one}, {one}, onLines(rgbToYuv, toYuv(b601, false))},
    {"split YUYV", {twoBytes}, {one, half, half}, onLines(splitYuyv, true)},
    {"split UYVY", {twoBytes}, {one, half, half}, onLines(splitYuyv, false)},
    {"join YUYV", {one, half, half}, {twoBytes}, onLines(joinYuyv, true)},
    {"join UYVY", {one, half, half}, {twoBytes}, onLines(joinYuyv, false)},
    {"rgb4ToYuv", {four}, {one, one, one}, onLines(rgb4ToYuv, toYuv(b601, false))},
    {"rgb4ToYuv video", {four}, {one, one, one}, onLines(rgb4ToYuv, toYuv(b709, true))},
    {"rgbToYuv", {one, one, one}, {one, one, one}, onLines(rgbToYuv, toYuv(b709, false)), true},
    {"yuvToRgb", {one, one, one}, {one, one, one}, onLines(yuvToRgb, toRgb(b601, false)), true},
    {"yuvToRgb4", {one, one, one}, {four}, onLines(yuvToRgb4, toRgb(b709, false), false)},
    {"yuvToRgb3 video", {one, one, one}, {three}, onLines(yuvToRgb3, toRgb(b709, true), false)},
    {"yuvToRgb4, chroma repeated",
     {one, half, half},
     {four},
     [](const LineCase& l) {
         if (l.n > 1) onLines(yuvToRgb4, toRgb(b601, false), true)(l);
     }},
    {"yuvToOther",
     {one, one, one},
     {one, one, one},
     [](const LineCase& l) {
         for (int i = 0; i < 3; ++i) std::memmove(l.out[i], l.in[i], l.n);
         yuvToOther(toOther(b709), l.out[0], l.out[1], l.out[2], l.n);
     }},
    {"toVideoLevels", {one}, {one}, onLines(toVideoLevels), true},
    {"toFullLevels", {one}, {one}, onLines(toFullLevels), true},
    {"widen", {one}, {word}, onLines(widen, false)},
    {"widen full", {one}, {word}, onLines(widen, true)},
    {"narrow", {word}, {one}, onLines(narrow, false)},
    {"narrow full", {word}, {one}, onLines(narrow, true)},
    {"twice", {one}, {twoBytes}, onLines(twice)},
    {"evens", {twoBytes}, {one}, onLines(evens)},
    {"doubleLine", {half}, {one}, onLines(doubleLine)},
    {"rgb4ToLuma", {four}, {one}, onLines(rgb4ToLuma, toYuv(b709, false))},
    {"chroma of four lines", {four, four, four, four}, {half, half}, chroma({2, 6, 6, 2}, true)},
    {"chroma of a line", {four, four, four, four}, {half, half}, chroma({chromaUnity}, true)},
    {"chroma of single pixels", {four, four, four, four}, {half, half}, chroma({1, 5, 7, 3}, false)},
    {"chroma of a line's pixels", {four, four, four, four}, {half, half}, chroma({chromaUnity}, false)},
    {"luma of YUYV", {twoBytes}, {one}, onLines(packedToLuma, true)},
    {"luma of UYVY", {twoBytes}, {one}, onLines(packedToLuma, false)},
    {"chroma of YUYV", {four}, {one, one}, packedChroma({}, true)},
    {"chroma of UYVY", {four}, {one, one}, packedChroma({}, false)},
    {"chroma of YUYV, four lines",
     {four, four, four, four},
     {one, one},
     packedChroma({16, 48, 48, 16}, true)},
    {"chroma of UYVY, four lines", {four, four, four, four}, {one, one}, packedChroma({127, 1, 0, 0}, false)},
};

}  // namespace

TEST(Rows8, UnitsGiveTheBytesOfThePlainLoops) { compareUnits(kernels); }

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
