#include "core/measure/mediarange.h"

#include <gtest/gtest.h>

namespace {

TEST(MediaRange, CountsFramesOfBothRates) {
    const QvFramerate f25 = QvFramerate::f25p(), f50(50.0), f24 = QvFramerate::f24p();
    const struct {
        double in, out;  // seconds
        QvFramerate inRate, outRate;
        int start, stop, frames, outFrames;
        bool pairCompleted;
    } rows[] = {
        {0, 4, f25, f25, 0, 99, 100, 100, false},  {1, 2, f25, f50, 25, 49, 25, 50, false},
        {0, 0.22, f50, f25, 0, 11, 12, 6, true},  // 11 frames, one more for the last pair
        {0, 0.24, f50, f25, 0, 11, 12, 6, false},  {0.02, 0.24, f50, f25, 1, 12, 12, 6, true},
        {0, 0.44, f25, f24, 0, 10, 11, 10, false},  // odd, but not halved
    };
    for (const auto& row : rows) {
        QvFrameRange range(MediaTime(row.in), MediaTime(row.out), row.inRate);
        EXPECT_FALSE(range.empty());
        range.convert(row.inRate, row.outRate);
        EXPECT_EQ(range.start, row.start);
        EXPECT_EQ(range.stop, row.stop);
        EXPECT_EQ(range.in, row.frames);
        EXPECT_EQ(range.out, row.outFrames);
        EXPECT_EQ(range.pairCompleted, row.pairCompleted);
    }
    EXPECT_TRUE(QvFrameRange(MediaTime(1.0), MediaTime(1.0), f25).empty());
}

TEST(MediaRange, CountsSamplesOfBothSides) {
    const struct {
        int inRate, outRate;
        double in, out;
        long long inStart, inEnd, outStart, made;
    } rows[] = {
        {44100, 48000, 1.0, 3.0, 44100, 132300, 48000, 96000},
        {48000, 44100, 0.5, 2.5, 24000, 120000, 22050, 88200},
        {48000, 48000, 0.0, 0.0, 0, 0, 0, 0},
        {11025, 96000, 0.25, 1.0, 2756, 11025, 24000, 72000},
        {44100, 96000, 0.0, 0.500015, 0, 22050, 0,
         48000},  // the rest of a sample that is not read makes none
    };
    for (const auto& row : rows) {
        const QvSampleRange range(MediaTime(row.in), MediaTime(row.out), row.inRate, row.outRate);
        EXPECT_EQ(range.inStart, row.inStart);
        EXPECT_EQ(range.inEnd, row.inEnd);
        EXPECT_EQ(range.outStart, row.outStart);
        EXPECT_EQ(range.out, row.made);
    }
}

// A rate that doesn't divide the timescale: the time of a frame or sample must still be within it.
TEST(MediaRange, InstantAndUnitAgreeAtEveryRate) {
    for (const QvRatio rate : {QvRatio(8000, 1), QvRatio(11025, 1), QvRatio(44056, 1), QvRatio(47952, 1),
                               QvRatio(95904, 1), QvRatio(151, 20), QvRatio(3000, 7), QvRatio(30000, 1001)})
        for (const long long unit : {0LL, 1LL, 20LL, 999LL, 1234567LL, 92233720368LL})
            EXPECT_EQ(qvInstantOf(unit, rate).position(rate), unit) << rate.num << "/" << rate.den;
}

}  // namespace
