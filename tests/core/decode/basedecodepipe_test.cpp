#include "core/decode/basedecodepipe.h"

#include <gtest/gtest.h>

#include <functional>
#include <string>

#include "core/engine/qvexception.h"
#include "tests/core/decode/fake_decoder.h"

namespace {

class Base : public testing::Test {
  protected:
    Base() {
        decoder.init();
        decoder.open();
    }
    // The error that the operation leaves behind when it asserts.
    std::string refusal(const std::function<void()>& operation) {
        EXPECT_THROW(operation(), QvAssertFailure);
        return std::to_string(decoder.errorCode()) + " " + decoder.errorDesc();
    }
    FakeDecoder decoder;
};

TEST_F(Base, CountsByMask) {
    const struct {
        int mask;
        int count;
    } cases[] = {{0, 2}, {255, 2}, {1, 1}, {2, 1}, {4, 0}, {3, 2}, {6, 1}};
    for (const auto& c : cases) EXPECT_EQ(decoder.nrStreams(c.mask), c.count) << c.mask;
}

TEST_F(Base, SelectionIsAFlagOfTheStream) {
    EXPECT_EQ(decoder.select(2, 0), 0);
    EXPECT_EQ(decoder.select(2, 0), 0);
    EXPECT_TRUE(decoder.isSelected(2, 0));
    AnyDict numbers;
    EXPECT_EQ(decoder.selected(numbers), 0);
    EXPECT_TRUE(numbers["video"] == Any(AnyVector(0))) << "deselected streams are listed, too";
    EXPECT_TRUE(numbers["audio"] == Any(AnyVector(0)));
    EXPECT_EQ(decoder.deselect(2, 0), 0);
    EXPECT_FALSE(decoder.isSelected(2, 0));
    EXPECT_FALSE(decoder.isSelected(2, 7));
    EXPECT_EQ(refusal([this] { decoder.select(1, 1); }), "-1 DecodePipe: invalid stream");
    EXPECT_EQ(refusal([this] { decoder.deselect(4, 0); }), "-1 DecodePipe: invalid stream");
}

TEST_F(Base, LengthsComeFromTheParameters) {
    EXPECT_EQ(decoder.nrFrames(0), 100);
    EXPECT_EQ(decoder.nrSamples(0), 4000);
    EXPECT_EQ(refusal([this] { decoder.nrFrames(1); }), "-1 invalid video stream number 1");
    EXPECT_EQ(refusal([this] { decoder.nrSamples(-1); }), "-1 invalid audio stream #-1");
    decoder.close();
    EXPECT_EQ(refusal([this] { decoder.nrFrames(0); }), "-18 nrFrames: illegal state");
    EXPECT_EQ(refusal([this] { decoder.nrSamples(0); }), "-18 nrSamples: illegal state");
    EXPECT_EQ(decoder.close(), 0);
    EXPECT_EQ(decoder.getState(), 2);
    EXPECT_EQ(decoder.open(), 0) << "close makes room for the next open";
}

TEST_F(Base, ChecksNameTheOperation) {
    EXPECT_EQ(decoder.checkState(3, "read"), 0);
    EXPECT_EQ(refusal([this] { decoder.checkState(2, "setSize"); }), "-18 Invalid state 2 in setSize call");
    EXPECT_EQ(refusal([this] { decoder.checkState(2, nullptr); }), "-18 Invalid state 2 in method call");
    EXPECT_EQ(decoder.checkStream(1, 0, "read"), 0);
    EXPECT_EQ(refusal([this] { decoder.checkStream(1, 1, "read"); }),
              "-13 Invalid stream video#1 in read call");
    EXPECT_EQ(refusal([this] { decoder.checkStream(2, -1, nullptr); }),
              "-13 Invalid stream audio#-1 in method call");
    EXPECT_EQ(refusal([this] { decoder.checkStream(4, 0, "x"); }), "-13 Invalid stream subpic#0 in x call");
    EXPECT_THROW(decoder.checkStream(3, 0, "x"), QvAssertFailure);
}

TEST_F(Base, UnsupportedOperationsAssert) {
    EXPECT_THROW(decoder.readFrame(0), QvAssertFailure);
    EXPECT_THROW(decoder.getFramePtr(0), QvAssertFailure);
    EXPECT_THROW(decoder.BaseDecodePipe::getAudioPtr(0), QvAssertFailure);
    EXPECT_THROW(decoder.BaseDecodePipe::readSamples(1, 0), QvAssertFailure);
    EXPECT_THROW(decoder.BaseDecodePipe::seekToSample(1, 0), QvAssertFailure);
    EXPECT_THROW(decoder.BaseDecodePipe::seekToFrame(1, 0), QvAssertFailure);
    EXPECT_THROW(decoder.setParam("unknown", 1), QvParamException);
}

}  // namespace
