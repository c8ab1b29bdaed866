#include "core/transcode/link/audio/sampleclock_p.h"

#include <gtest/gtest.h>

namespace {

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
