#include "tarsel/job/plan/colours.h"

#include <gtest/gtest.h>

namespace {

// Matrices of ITU-T H.273: 1 is BT.709, 5 and 6 are BT.601, 9 is BT.2020; 2 is one that is not said.
TEST(Colours, AreKeptWhereTheScalerGoesFromAMatrixToTheSame) {
    const struct {
        int space, in, out;  // lines
        bool kept;
    } rows[] = {
        {5, 1080, 576, true}, {6, 1080, 576, true}, {5, 1080, 720, false}, {6, 1080, 1080, false},
        {1, 576, 720, true},  {1, 576, 719, false}, {2, 576, 576, true},   {2, 576, 720, false},
        {2, 720, 1080, true}, {2, 720, 719, false}, {9, 1080, 1080, true}, {9, 1080, 576, false},
    };
    for (const auto& row : rows) {
        const PictureFormat in{.height = row.in, .fourcc = QvFourcc::I420, .colours = {1, 1, row.space}};
        PictureFormat out{.height = row.out, .fourcc = QvFourcc::YUY2};
        EXPECT_EQ(coloursOf(in, out, true).space, row.kept ? row.space : 0)
            << row.space << ": " << row.in << " to " << row.out;
        EXPECT_EQ(coloursOf(in, out, false).space, row.space) << "not converted";
        out.fourcc = QvFourcc::BGR4;
        EXPECT_FALSE(coloursOf(in, out, false).stated());
        EXPECT_FALSE(coloursOf(out, in, false).stated());
    }
}

TEST(Colours, AreWideByAnyOfTheirNumbers) {
    for (const Colours& wide : {Colours{9, 1, 1}, {12, 0, 0}, {1, 16, 1}, {1, 18, 1}, {1, 1, 9}, {0, 0, 14}})
        EXPECT_TRUE(isWide(wide)) << wide.primaries << " " << wide.transfer << " " << wide.space;
    for (const Colours& usual : {Colours{}, {1, 1, 1}, {5, 6, 5}, {6, 6, 6}, {8, 17, 8}})
        EXPECT_FALSE(isWide(usual)) << usual.primaries << " " << usual.transfer << " " << usual.space;
}

}  // namespace
