#include <gtest/gtest.h>

#include <cmath>
#include <cstdlib>
#include <memory>

#include "core/encode/qvencodepipe.h"
#include "core/encode/qvencoder.h"
#include "core/engine/init.h"
#include "core/engine/qvutil.h"
#include "core/media/bitrate.h"
#include "core/media/qvframerate.h"
#include "core/media/streamtype.h"
#include "tests/support/temp_folder.h"

namespace {

// A pipe with one raw video stream (64x32 at 25 frames a second) and `audioStreams` raw sound streams
// (48 kHz, stereo, 16 bits: 1,536,000 bit/s each).
std::unique_ptr<QvEncodePipe> makePipe(int audioStreams) {
    static const TempFolder home;
    setenv("HOME", home.path().c_str(), 1);  // the settings folder is made there
    init_wrapper(nullptr);
    std::unique_ptr<QvEncodePipe> pipe(QvEncodePipe::create());
    EXPECT_EQ(pipe->setMuxer("rawmux"), 0);
    pipe->removeStreams(qvAllStreams);
    EXPECT_EQ(pipe->addStream(1, "rawvenc"), 0);
    QvEncoder& video = *pipe->encoder(1, 0);
    video.setParam("width", 64);
    video.setParam("height", 32);
    video.setParam("framerate", QvFramerate(25.0));
    for (int i = 0; i < audioStreams; ++i) {
        EXPECT_EQ(pipe->addStream(2, "rawaenc"), i);
        QvEncoder& audio = *pipe->encoder(2, i);
        audio.setParam("samplerate", 48000);
        audio.setParam("channels", 2);
        audio.setParam("bitsPerSample", 16);
    }
    return pipe;
}

TEST(RatePlan, RatesAreTheSumsOfTheEncoders) {
    const auto pipe = makePipe(2);
    const double expectedVideo = pipe->encoder(1, 0)->getParam("bitrate").asBitrate().target;
    double video, audio;
    EXPECT_EQ(QvUtil::getRates(pipe.get(), video, audio), 0);
    EXPECT_GT(video, 0);
    EXPECT_EQ(video, expectedVideo);
    EXPECT_EQ(audio, 2 * 1'536'000.0);
    EXPECT_EQ(QvUtil::getRates(nullptr, video, audio), -1);
    EXPECT_EQ(video + audio, 0);
}

TEST(RatePlan, WhatAudioLeavesGoesToVideo) {
    const auto pipe = makePipe(1);
    // 10 MB in 10 s: 8 Mbit/s, less a fiftieth.
    EXPECT_NEAR(QvUtil::targetBitrate(pipe.get(), 10, 10e6), 7'840'000 - 1'536'000, 1e-3);
    EXPECT_EQ(QvUtil::targetBitrate(pipe.get(), 10, 1000), 0);
    for (const double bad : {0.0, -1.0, std::nan("")}) {
        EXPECT_EQ(QvUtil::targetBitrate(pipe.get(), bad, 10e6), 0);
        EXPECT_EQ(QvUtil::targetBitrate(pipe.get(), 10, bad), 0);
    }
}

TEST(RatePlan, SuggestedRatesFitTheFileTogether) {
    for (const int audioStreams : {0, 1, 3}) {
        const auto pipe = makePipe(audioStreams);
        for (const double bytes : {1000.0, 1e6, 10e6, 1e10}) {
            double video = -1, audio = -1;
            ASSERT_EQ(QvUtil::suggestRates(pipe.get(), 10, bytes, video, audio), 0);
            const double all = bytes * 8 * 0.98 / 10;
            EXPECT_NEAR(video + audioStreams * audio, all, all * 1e-9);
            EXPECT_LE(audioStreams * audio, all / 3 + 1e-9);
            EXPECT_LE(audio, 1'536'000);
        }
        double video = -1, audio = -1;
        EXPECT_EQ(QvUtil::suggestRates(pipe.get(), 0, 1e6, video, audio), -1);
        EXPECT_EQ(video, 0);
        EXPECT_EQ(audio, 0);
    }
}

}  // namespace
