#include "core/transcode/link/audio/sampleclock_p.h"

#include <gtest/gtest.h>

namespace {

TEST(SampleClock, TheRangeInSamplesOfBothSides) {
    const struct {
        int inRate, outRate;
        double in, out;
        long long inStart, inEnd, outStart, totalOut;
    } rows[] = {
        {44100, 48000, 1.0, 3.0, 44100, 132300, 48000, 96000},
        {48000, 44100, 0.5, 2.5, 24000, 120000, 22050, 88200},
        {48000, 48000, 0.0, 0.0, 0, 0, 0, 0},
        {11025, 96000, 0.25, 1.0, 2756, 11025, 24000, 72000},
    };
    for (const auto& row : rows) {
        SampleClock clock(row.inRate, row.outRate);
        clock.setRange(MediaTime(row.in), MediaTime(row.out));
        EXPECT_EQ(clock.inStart(), row.inStart);
        EXPECT_EQ(clock.inEnd(), row.inEnd);
        EXPECT_EQ(clock.outStart(), row.outStart);
        EXPECT_EQ(clock.totalOut(), row.totalOut);
        EXPECT_EQ(clock.outEnd(), row.outStart + row.totalOut);
    }
}

// A rate that doesn't divide the timescale: the time of a sample must still be that sample's.
TEST(SampleClock, TimeAndSampleAgreeAtEveryRate) {
    for (const int rate : {8000, 11025, 22050, 44056, 47952, 48000, 95904, 96000})
        for (const long long sample : {0LL, 1LL, 999LL, 1234567LL, 92233720368547LL})
            EXPECT_EQ(SampleClock::timeOf(sample, rate).position(rate), sample) << rate;
}

TEST(SampleClock, FramesShareTheSamplesOfASecond) {
    const SampleClock clock(44100, 48000);
    const QvFramerate ntsc(QvRatio(30000, 1001));
    EXPECT_EQ(clock.samplesFor(0, ntsc), 0);
    EXPECT_EQ(clock.samplesFor(1, ntsc), 1601);
    EXPECT_EQ(clock.samplesFor(5, ntsc), 8008);
    EXPECT_EQ(clock.samplesFor(25, QvFramerate::f25p()), 48000);
}

TEST(SampleClock, CountsToTheEndAndThenSilence) {
    SampleClock clock(24000, 48000);
    clock.setRange(MediaTime(), MediaTime(1.0));
    EXPECT_FALSE(clock.complete());
    clock.wrote(47999);
    EXPECT_FALSE(clock.complete());
    EXPECT_DOUBLE_EQ(clock.percent(), 47998 * 100.0 / 24000 * 24000 / 48000);
    clock.wrote(1);
    EXPECT_TRUE(clock.complete());
    EXPECT_TRUE(clock.wroteSilence(10)) << "the first silence";
    EXPECT_FALSE(clock.wroteSilence(10));
    EXPECT_EQ(clock.written(), 48020);
    clock = SampleClock(24000, 48000);
    EXPECT_DOUBLE_EQ(clock.percent(), 0.0) << "an empty range";
    EXPECT_TRUE(clock.complete());
    EXPECT_TRUE(clock.wroteSilence(1)) << "of the next run";
}

TEST(SampleClock, PassedThroughTheOutputHasTheInputsSamples) {
    SampleClock clock(44100, 48000);
    clock.setRange(MediaTime(0.5), MediaTime(1.0));
    clock.passThrough();
    EXPECT_EQ(clock.totalOut(), 22050);
    EXPECT_EQ(clock.samplesFor(25, QvFramerate::f25p()), 44100);
}

}  // namespace
