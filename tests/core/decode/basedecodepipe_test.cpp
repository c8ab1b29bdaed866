#include "core/decode/basedecodepipe.h"

#include <functional>

#include "tests/core/decode/fake_decoder.h"
#include "tests/support/checks.h"

namespace {

class Base : public testing::Test {
  protected:
    Base() {
        decoder.init();
        decoder.open();
    }
    FakeDecoder decoder;
};

TEST_F(Base, SelectionIsAFlagOfTheStream) {
    for (const auto& [mask, count] : {Pair(0, 2), {255, 2}, {1, 1}, {2, 1}, {4, 0}, {3, 2}, {6, 1}})
        EXPECT_EQ(decoder.nrStreams(mask), count) << mask;
    for (int i = 0; i < 2; ++i) EXPECT_EQ(decoder.select(2, 0), 0);
    EXPECT_TRUE(decoder.isSelected(2, 0));
    AnyDict numbers;
    EXPECT_EQ(decoder.selected(numbers), 0);
    EXPECT_EQ(numbers, AnyDict("video", AnyVector(0), "audio", AnyVector(0))) << "all are listed";
    EXPECT_EQ(decoder.deselect(2, 0), 0);
    EXPECT_FALSE(decoder.isSelected(2, 0));
    EXPECT_FALSE(decoder.isSelected(2, 7));
}

// What is refused leaves an error that names the operation.
TEST_F(Base, RefusalsNameTheOperation) {
    EXPECT_EQ(decoder.nrFrames(0), 100);
    EXPECT_EQ(decoder.nrSamples(0), 4000);
    EXPECT_EQ(decoder.checkState(3, "read"), 0);
    EXPECT_EQ(decoder.checkStream(1, 0, "read"), 0);
    const struct {
        std::function<void()> act;
        const char* error;
    } rows[] = {
        {[&] { decoder.select(1, 1); }, "-1 DecodePipe: invalid stream"},
        {[&] { decoder.deselect(4, 0); }, "-1 DecodePipe: invalid stream"},
        {[&] { decoder.nrFrames(1); }, "-1 invalid video stream number 1"},
        {[&] { decoder.nrSamples(-1); }, "-1 invalid audio stream #-1"},
        {[&] { decoder.checkState(2, "setSize"); }, "-18 Invalid state 2 in setSize call"},
        {[&] { decoder.checkState(2, nullptr); }, "-18 Invalid state 2 in method call"},
        {[&] { decoder.checkStream(1, 1, "read"); }, "-13 Invalid stream video#1 in read call"},
        {[&] { decoder.checkStream(2, -1, nullptr); }, "-13 Invalid stream audio#-1 in method call"},
        {[&] { decoder.checkStream(4, 0, "x"); }, "-13 Invalid stream subpic#0 in x call"},
        {[&] { decoder.checkStream(3, 0, "x"); }, nullptr},
        {[&] { decoder.readFrame(0); }, nullptr},
        {[&] { decoder.getFramePtr(0); }, nullptr},
        {[&] { decoder.BaseDecodePipe::getAudioPtr(0); }, nullptr},
        {[&] { decoder.BaseDecodePipe::readSamples(1, 0); }, nullptr},
        {[&] { decoder.BaseDecodePipe::seekToSample(1, 0); }, nullptr},
        {[&] { decoder.BaseDecodePipe::seekToFrame(1, 0); }, nullptr},
        {[&] { decoder.close(), decoder.nrFrames(0); }, "-18 nrFrames: illegal state"},
        {[&] { decoder.nrSamples(0); }, "-18 nrSamples: illegal state"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        EXPECT_THROW(row.act(), QvAssertFailure);
        if (row.error) {
            EXPECT_EQ(std::to_string(decoder.errorCode()) + " " + decoder.errorDesc(), row.error);
        }
    }
    EXPECT_THROW(decoder.setParam("unknown", 1), QvParamException);
    EXPECT_EQ(decoder.close(), 0);
    EXPECT_EQ(decoder.open(), 0) << "close makes room for the next open";
}

}  // namespace
