#include "core/transcode/link/video/framerange_p.h"

#include <gtest/gtest.h>

namespace {

TEST(FrameRange, CountsFramesOfBothRates) {
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
        FrameRange range(MediaTime(row.in), MediaTime(row.out), row.inRate);
        EXPECT_FALSE(range.empty());
        range.convert(row.inRate, row.outRate);
        EXPECT_EQ(range.start, row.start);
        EXPECT_EQ(range.stop, row.stop);
        EXPECT_EQ(range.in, row.frames);
        EXPECT_EQ(range.out, row.outFrames);
        EXPECT_EQ(range.pairCompleted, row.pairCompleted);
    }
    EXPECT_TRUE(FrameRange(MediaTime(1.0), MediaTime(1.0), f25).empty());
}

}  // namespace
