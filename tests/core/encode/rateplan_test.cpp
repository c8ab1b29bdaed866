#include <cmath>

#include "core/encode/qvencoder.h"
#include "core/engine/qvutil.h"
#include "core/measure/bitrate.h"
#include "tests/support/checks.h"
#include "tests/support/output_pipe.h"

namespace {

// One raw video stream and raw sound streams of 1,536,000 bit/s each.
class RatePlan : public OutputPipe {
  protected:
    RatePlan() { addVideo(QvFourcc::I420, 64, 32); }
};

TEST_F(RatePlan, WhatAudioLeavesGoesToVideo) {
    addAudio(2, 16, 48000);
    // 10 MB in 10 s: 8 Mbit/s, less a fiftieth.
    EXPECT_NEAR(QvUtil::targetBitrate(pipe_.get(), 10, 10e6), 7'840'000 - 1'536'000, 1e-3);
    EXPECT_EQ(QvUtil::targetBitrate(pipe_.get(), 10, 1000), 0);
    for (const double bad : {0.0, -1.0, std::nan("")}) {
        EXPECT_EQ(QvUtil::targetBitrate(pipe_.get(), bad, 10e6), 0);
        EXPECT_EQ(QvUtil::targetBitrate(pipe_.get(), 10, bad), 0);
    }
    addAudio(2, 16, 48000);
    double video, audio;
    EXPECT_EQ(QvUtil::getRates(pipe_.get(), video, audio), 0);
    EXPECT_EQ(video, 64 * 32 * 1.5 * 8 * 25);
    EXPECT_EQ(audio, 2 * 1'536'000.0);
    EXPECT_EQ(QvUtil::getRates(nullptr, video, audio), -1);
    EXPECT_EQ(video + audio, 0);
}

TEST_F(RatePlan, SuggestedRatesFitTheFileTogether) {
    for (int audioStreams = 0; audioStreams < 3; ++audioStreams) {
        for (const double bytes : {1000.0, 1e6, 10e6, 1e10}) {
            double video = -1, audio = -1;
            ASSERT_EQ(QvUtil::suggestRates(pipe_.get(), 10, bytes, video, audio), 0);
            const double all = bytes * 8 * 0.98 / 10;
            EXPECT_NEAR(video + audioStreams * audio, all, all * 1e-9);
            EXPECT_LE(audioStreams * audio, all / 3 + 1e-9);
            EXPECT_LE(audio, 1'536'000);
        }
        addAudio(2, 16, 48000);
    }
    double video = -1, audio = -1;
    EXPECT_EQ(QvUtil::suggestRates(pipe_.get(), 0, 1e6, video, audio), -1);
    EXPECT_EQ(video, 0);
    EXPECT_EQ(audio, 0);
}

}  // namespace
