#include "core/media/quality/qvhistogram.h"

#include "core/engine/status.h"
#include "core/media/qvframe.h"
#include "tests/support/checks.h"

namespace {

QvFrame flat(unsigned fourcc, int width, int height, int value) {
    QvFrame frame;
    frame.init(fourcc, width, height);
    std::memset(frame.plane(), value, static_cast<size_t>(frame.total_bytes()));
    return frame;
}

TEST(Histogram, CountsLevelsAndWhatLeavesTheirRange) {
    QvHistogram levels;
    QvFrame frame = flat(QvFourcc::I420, 10, 4, 100);
    for (int x = 0; x < 10; ++x)
        frame.plane(0)[x] = static_cast<unsigned char>(x < 3 ? 0 : x < 5 ? 15 : x < 9 ? 236 : 255);
    frame.plane(1)[0] = 241;
    ASSERT_EQ(levels.add(frame), 0);
    ASSERT_EQ(levels.channels(), 3);
    const auto& luma = levels.channel(0);
    EXPECT_EQ(luma.samples, 40);
    EXPECT_EQ(luma.below, 5);
    EXPECT_EQ(luma.above, 5);
    EXPECT_EQ(luma.atFloor, 3);
    EXPECT_EQ(luma.atCeiling, 1);
    EXPECT_EQ(luma.min(), 0);
    EXPECT_EQ(luma.max(), 255);
    EXPECT_EQ(luma.percentile(0.5), 100);
    EXPECT_EQ(luma.percentile(0.0), 0);
    EXPECT_EQ(luma.percentile(1.0), 255);
    EXPECT_DOUBLE_EQ(luma.share(luma.above), 0.125);
    EXPECT_DOUBLE_EQ(luma.mean(), (30 * 100 + 2 * 15 + 4 * 236 + 255) / 40.0);
    EXPECT_EQ(levels.channel(1).above, 1);
    EXPECT_EQ(levels.channel(2).above, 0);
    EXPECT_EQ(levels.channel(2).samples, 10);
    // Pictures add up, of one format.
    ASSERT_EQ(levels.add(frame), 0);
    EXPECT_EQ(levels.channel(0).below, 10);
    EXPECT_EQ(levels.add(flat(QvFourcc::GRAY, 10, 4, 1)), QvStatus::invalidArgument);
    EXPECT_EQ(levels.add(flat(QvFourcc::BGR3, 10, 4, 1)), QvStatus::invalidArgument);
    EXPECT_EQ(levels.add(flat(QvFourcc::W016, 10, 4, 1)), QvStatus::invalidArgument);
    EXPECT_EQ(levels.add(QvFrame()), QvStatus::invalidArgument);
    EXPECT_EQ(levels.channel(0).samples, 80);
    levels.clear();
    EXPECT_EQ(levels.channels(), 0);
    EXPECT_EQ(levels.add(flat(QvFourcc::v210, 48, 4, 1)), QvStatus::notSupported);
    EXPECT_NE(failureOf([&] { levels.channel(0); }), "no failure");
    // Words count by 10 bits: 0x4141 is 260 of 1024.
    ASSERT_EQ(levels.add(flat(QvFourcc::W016, 10, 4, 0x41)), 0);
    EXPECT_EQ(levels.channel(0).min(), 0x4141 >> 6);
    EXPECT_EQ(levels.channel(0).highest, 940);
    levels.clear();
    ASSERT_EQ(levels.add(flat(QvFourcc::BGR3, 8, 4, 255)), 0);
    EXPECT_EQ(levels.channel(0).name, 'R');
    EXPECT_EQ(levels.channel(0).above, 0) << "of RGB all levels are meant";
    EXPECT_EQ(levels.channel(0).atCeiling, 32);
}

// A ramp is a diagonal, from the bottom left on.
TEST(Histogram, TheWaveformShowsLevelsByColumn) {
    QvFrame frame = flat(QvFourcc::GRAY, 256, 16, 0), wave;
    for (int y = 0; y < 16; ++y)
        for (int x = 0; x < 256; ++x) *frame.pixelPtr(x, y) = static_cast<unsigned char>(x);
    ASSERT_EQ(QvHistogram::waveform(frame, wave), 0);
    ASSERT_EQ(wave.width(), 256);
    ASSERT_EQ(wave.height(), 256);
    ASSERT_EQ(wave.four_cc(), QvFourcc::BGR3);
    for (int x = 0; x < 256; ++x)
        for (int level = 0; level < 256; ++level) {
            const int expected = level == x ? 255 : level == 16 || level == 235 ? 72 : 0;
            ASSERT_EQ(wave.pixelPtr(x, 255 - level)[1], expected) << x << " " << level;
        }
    // One sample of many is seen, though dark; chroma stands to the right.
    QvFrame picture = flat(QvFourcc::YUY2, 64, 100, 128);
    picture.plane()[0] = 200;
    ASSERT_EQ(QvHistogram::waveform(picture, wave, 100), 0);
    EXPECT_EQ(wave.width(), 64 + 32 + 32);
    EXPECT_NEAR(wave.pixelPtr(0, 55)[1], 25, 1);
    EXPECT_EQ(wave.pixelPtr(64, 127)[0], 255);
    EXPECT_EQ(QvHistogram::waveform(QvFrame(), wave), QvStatus::invalidArgument);
}

}  // namespace
