#include "core/decode/qvtestgenerator.h"

#include <gtest/gtest.h>

#include "core/decode/qvdecoder.h"
#include "tests/support/engine.h"

namespace {

TEST(QvTestGenerator, ItsStreamsAreThoseAskedFor) {
    const EngineScope engine;
    GeneratorVParams video;
    video.duration = MediaTime(2.0);
    video.framerate = QvFramerate(25.0);
    video.width = 64;
    video.height = 48;
    GeneratorAParams audio;
    audio.duration = MediaTime(3.0);
    const std::unique_ptr<QvDecodePipe> both(QvTestGenerator::create(&video, &audio));
    ASSERT_EQ(both->open(), 0) << both->errorDesc();
    EXPECT_EQ(both->nrFrames(0), 50);
    EXPECT_EQ(both->getVideoParam(0, "width"), Any(64));
    EXPECT_EQ(both->getVideoParam(0, "height"), Any(48));
    EXPECT_EQ(both->nrSamples(0), 3 * 44100);
    const std::unique_ptr<QvDecodePipe> silent(QvTestGenerator::create(&video, nullptr));
    ASSERT_EQ(silent->open(), 0) << silent->errorDesc();
    EXPECT_EQ(silent->nrStreams(qvAudioStream), 0);
}

}  // namespace
