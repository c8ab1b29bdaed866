#include "core/job/streamformat.h"

#include "core/value/anycontainer.h"
#include "tests/support/checks.h"

namespace {

TEST(StreamFormat, WhatIsAbsentKeepsItsDefault) {
    const AudioFormat sound((AnyDict()));
    EXPECT_EQ(sound.samplerate, 0);
    EXPECT_EQ(sound.channels, 0);
    EXPECT_EQ(sound.bits, 16);
    EXPECT_EQ(sound.bytesPerSample(), 2);
    EXPECT_EQ(sound.samples, AudioFormat::unknownLength);
    const VideoFormat picture((AnyDict()));
    EXPECT_EQ(std::pair(picture.width, picture.height), std::pair(0, 0));
    EXPECT_EQ(picture.frames, 0);
    EXPECT_EQ(picture.frameAspect, 1.0);
    EXPECT_FALSE(picture.hasRate());
}

}  // namespace
