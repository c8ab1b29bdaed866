#include "tests/core/transcode/transcode_fixture.h"
#include "tests/support/failing_codecs.h"

namespace {

// Three frames into the raw output, whose video encoder wants two passes.
struct TwoPass {
    TwoPass() : pipe(QvEncodePipe::create()), decoder(3, QvFramerate::f25p()) {
        outputs.params.set("rawvenc.twoPassPossible", 1);
        const int format = static_cast<int>(QvFourcc::I420);
        decoder.video.set("FOURCC", format);
        pipe->clearStreams();
        pipe->addVideoStream(Any("rawvenc"));
        pipe->setParam("video0", AnyDict("type", format, "width", 16, "height", 8, "framerate",
                                         Any(QvFramerate::f25p())));
        pipe->setFilename(Any(folder.file("out.x").c_str()));
        task.setEncoder(pipe.get());
        EXPECT_EQ(task.link(&decoder, qvVideoStream, 0, 0), 0) << task.errorDesc();
        outputs.watched = "rawvenc.meta";
        t.setParam("twoPass", 1);
        t.setParam("metaName", folder.file("stats").c_str());
    }
    int run() {
        outputs.calls.clear();
        const int result = t.transcode(true);
        for (const auto& call : outputs.calls)
            if (call.starts_with("rawvenc.") || call == outputs.failAt)
                calls += call.substr(call.find('.') + 1) + " ";
        return result;
    }

    FailingOutputs outputs;
    TempFolder folder;
    std::unique_ptr<QvEncodePipe> pipe;
    FakeDecoder decoder;
    QvTask task;
    Events events;
    std::string calls;
    NotedTranscoder t{events, &task};
};

TEST(TwoPasses, TheFirstLeavesNothingButItsStatistics) {
    TwoPass job;
    job.task.setProcessParams(
        ProcessParams(AnyDict("inOutPoints", AnyVector(Any(MediaTime(0.04)), Any(MediaTime(0.12))))), 1);
    job.t.setParam("progress", AnyDict("each", 1));
    Any second;
    std::string passes;
    job.t.onProcess = [&] {
        job.t.getParam("secondPass", second);
        passes += second.isTrue() ? "2" : "1";
        return 0;
    };
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.calls, "meta=1 open write write close meta=1 open write write meta=0 close ");
    EXPECT_EQ(job.events.take(), "0.00 0.00 0.25 0.50 0.75 muxclose done0");
    EXPECT_EQ(passes, "1122");
    const Any files = job.pipe->getMuxer()->getParam("filenames");
    ASSERT_EQ(files.asVector().size(), 1);
    EXPECT_EQ(TempFolder::read(files.asVector().at(0).asString()).size(), 2u * 16 * 8 * 3 / 2);
    EXPECT_FALSE(std::filesystem::exists(job.folder.file("stats00.md0")));
}

TEST(TwoPasses, EveryFailureEndsTheRunAndForgetsTheStatistics) {
    const struct {
        const char* failAt;
        FailingOutputs::How how;
        const char* calls;
    } rows[] = {
        {"rawvenc.write", FailingOutputs::status, "meta=1 open write close meta=0 abort "},
        {"rawvenc.write", FailingOutputs::assertion, "meta=1 open write abort meta=0 abort "},
        {"rawvenc.close", FailingOutputs::status, "meta=1 open write write write close meta=1 meta=0 abort "},
        {"rawmux.open", FailingOutputs::status,
         "meta=1 open write write write close meta=1 open close meta=0 abort "},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.failAt);
        TwoPass job;
        job.outputs.failAt = row.failAt;
        job.outputs.how = row.how;
        EXPECT_LT(job.run(), 0);
        EXPECT_EQ(job.calls, row.calls);
        EXPECT_STREQ(job.t.errorDesc(), "Error in processing");
    }
}

TEST(TwoPasses, AStopInTheFirstPassIsNoFailure) {
    TwoPass stopped;
    stopped.t.onProcess = [] { return 1; };
    EXPECT_EQ(stopped.run(), 0);
    EXPECT_EQ(stopped.calls, "meta=1 open write close meta=0 close ");
    EXPECT_TRUE(stopped.events.take().ends_with("done1"));
}

TEST(TwoPasses, WithoutAnEncoderForItOnePassIsRun) {
    TwoPass job;
    job.outputs.params.clear();
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.calls, "open write write write meta=0 close ");
}

}  // namespace
