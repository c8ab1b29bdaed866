#include "core/encode/qvencodepipe.h"

#include "core/encode/encodefactory.h"
#include "core/job/filtersstate.h"
#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"
#include "tests/support/failing_codecs.h"

namespace {

struct Pipe : testing::Test {
    FailingOutputs outputs_;
    std::unique_ptr<QvEncodePipe> pipe_{QvEncodePipe::create()};
};

TEST_F(Pipe, AFactoryMakesThemWithAndWithoutSettings) {
    for (QvEncodePipe* made : {QvEncFactory::encodePipe(), QvEncFactory::encodePipe(AnyDict("any", 1))}) {
        const std::unique_ptr<QvEncodePipe> owner(made);
        EXPECT_NE(made, nullptr);
    }
}

// The pipe has one stream of each kind.
TEST_F(Pipe, RoomForStreams) {
    const struct {
        int videos, audios, subpics, total;
        int forVideo, forAudio, forSubpic, forAny;
    } rows[] = {{0, 1, 0, 9, -1, 0, -1, 7},
                {2, 4, 1, 9, 1, 3, 1, 7},
                {9, 9, 0, 2, 0, 0, -1, 0},
                {1, 1, 9, 2, 0, 0, 0, 0}};
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        outputs_.params.set("rawmux.maxStreams", AnyDict("vids", row.videos, "auds", row.audios, "subs",
                                                         row.subpics, "total", row.total));
        EXPECT_EQ(pipe_->canAddStreams(qvVideoStream), row.forVideo);
        EXPECT_EQ(pipe_->canAddStreams(qvAudioStream), row.forAudio);
        EXPECT_EQ(pipe_->canAddStreams(qvSubpicStream), row.forSubpic);
        EXPECT_EQ(pipe_->canAddStreams(0), row.forAny);
        EXPECT_EQ(pipe_->maxStreams(qvSubpicStream), row.subpics);
        EXPECT_EQ(pipe_->maxStreams(0), row.total);
    }
    outputs_.params.set("rawmux.maxStreams", "many");
    EXPECT_THROW(pipe_->maxStreams(1), QvAssertFailure);
}

TEST_F(Pipe, WhatIsNotThereIsNull) {
    EXPECT_FALSE(pipe_->programSetup() || pipe_->programsSupported() || pipe_->outputQueue());
    for (const auto& [type, nr] : {std::pair(1, 1), {1, -1}, {2, 7}, {4, 0}, {3, 0}}) {
        EXPECT_EQ(pipe_->stream(type, nr), nullptr);
        EXPECT_EQ(pipe_->encoder(type, nr), nullptr);
    }
    EXPECT_EQ(pipe_->encoder(2), nullptr);
    EXPECT_THROW(pipe_->streamAt(2), QvAssertFailure);
    FiltersState filters;
    filters.setFilter("cropper", AnyDict("name", "cropper", "_on", 1));
    pipe_->setFilters(qvAudioStream, 0, filters);
    EXPECT_EQ(pipe_->filters(qvAudioStream, 0), filters);
    EXPECT_TRUE(pipe_->filters(qvVideoStream, 0).empty());
}

TEST_F(Pipe, DescribesItsStreams) {
    pipe_->setParam("video0", AnyDict("width", 1280, "height", 720, "framerate", QvFramerate(25.0)));
    AnyVector desc;
    pipe_->getStreamDesc(qvVideoStream, 0, desc);
    ASSERT_EQ(desc.size(), 3);
    EXPECT_EQ(desc[0], "1280x720");
    for (const auto& [channels, text] : {std::pair(1, "mono"), {2, "stereo"}, {6, "multi ch."}}) {
        pipe_->setParam("audio0", AnyDict("channels", channels, "samplerate", 44100));
        pipe_->getStreamDesc(qvAudioStream, 0, desc);
        ASSERT_EQ(desc.size(), 3);
        EXPECT_EQ(desc[0], "44100Hz");
        EXPECT_EQ(desc[1], text);
    }
    pipe_->getStreamDesc(qvAudioStream, 1, desc);
    EXPECT_TRUE(desc.empty());
}

}  // namespace
