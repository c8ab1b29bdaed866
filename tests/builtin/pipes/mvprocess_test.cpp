// One chain for each view, in step, and what keeps them so.
#include "builtin/pipes/mvprocess.h"

#include <gmock/gmock.h>

#include "core/filter/qvprocessutil.h"
#include "core/job/jobdescription.h"
#include "core/transcode/link/video/totalframes_p.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/fake_streams.h"
#include "tests/support/pictures.h"

namespace {

using testing::HasSubstr;

// Two views of GRAY, of which each frame has its own value.
struct TwoViews : FakeDecoder {
    TwoViews() : FakeDecoder(8, QvFramerate::f25p(), 32, 16) {}
    int readFrame(int stream) override {
        if (const int result = FakeDecoder::readFrame(stream); result != 0) return result;
        if (single) return 0;
        other = frame;
        TPtrList<QvFrame> views;
        unsigned char value = 10;
        for (QvFrame* view : {&frame, &other}) {
            std::memset(view->plane(0), value + frame.frameNr,
                        static_cast<std::size_t>(view->plane_bytes(0)));
            views.append(view);
            value = 100;
        }
        QvFrame_linkViews(views);
        return 0;
    }
    QvFrame other;
    bool single = false;
};

VideoJobDescription job(const QvFramerate& out) {
    VideoJobDescription job;
    job.inWidth = 32, job.inHeight = 16;
    job.outWidth = 16, job.outHeight = 8;
    job.inFOURCC = job.outFOURCC = QvFourcc::GRAY;
    job.inFramerate = QvFramerate::f25p();
    job.outFramerate = out;
    job.stopFrame = 7;
    return job;
}

TEST(ViewsPipe, EveryViewGoesThroughAChainOfItsOwn) {
    const EngineScope engine;
    for (const QvFramerate& rate : {QvFramerate::f25p(), QvFramerate::f50p()}) {
        const VideoJobDescription described = job(rate);
        const std::unique_ptr<QvVProcessPipe> pipe(QvProcessUtil::createVideoPipeMV(described, 2));
        ASSERT_TRUE(pipe);
        ASSERT_STREQ(pipe->name(), "mvprocess");
        qvSetTotalFrames(*pipe, 8, 8);
        TwoViews decoder;
        int frames = 0;
        for (; pipe->process(&decoder, 0) == 0; pipe->next(), ++frames) {
            const QvFrame* first = pipe->frame();
            ASSERT_EQ(QvFrame_nrViews(first), 2);
            const QvFrame* second = first->nextView();
            EXPECT_EQ(first->width(), 16);
            EXPECT_EQ(second->height(), 8);
            EXPECT_EQ(second->plane(0)[0] - first->plane(0)[0], 90) << frames;
        }
        EXPECT_GE(frames, rate.is25p() ? 8 : 15);
        EXPECT_EQ(pipe->framesIn(), 8u);
        EXPECT_EQ(pipe->errorCode(), 0) << pipe->errorDesc();
        // Again, as a second pass does.
        EXPECT_EQ(pipe->close(), 0);
        EXPECT_EQ(pipe->open(), 0) << pipe->errorDesc();
        decoder.next = 0;
        EXPECT_EQ(pipe->process(&decoder, 0), 0);
    }
}

TEST(ViewsPipe, WhatWouldPutTheViewsOutOfStepIsRefused) {
    const EngineScope engine;
    const VideoJobDescription described = job(QvFramerate::f25p());
    const std::unique_ptr<QvVProcessPipe> pipe(QvProcessUtil::createVideoPipeMV(described, 2));
    TwoViews decoder;
    decoder.single = true;
    EXPECT_EQ(pipe->process(&decoder, 0), QvStatus::failed);
    EXPECT_THAT(pipe->errorDesc(), HasSubstr("1 views, not 2"));
    EXPECT_NE(pipe->addFilter(nullptr, 0), 0);
    EXPECT_NE(pipe->setParam("nrViews", 3), 0);

    MVProcessPipe alone;
    alone.init();
    for (const int views : {0, 17}) EXPECT_EQ(alone.setParam("nrViews", views), QvStatus::invalidParam);
    EXPECT_EQ(alone.setParam("nrViews", 2), 0);
    EXPECT_EQ(alone.open(), QvStatus::illegalState) << "no job";
    EXPECT_EQ(alone.setParam("jobDescription", Any(static_cast<const void*>(&described))), 0);
    EXPECT_EQ(alone.open(), QvStatus::failed) << "the job has filters that the pipe lacks";
}

}  // namespace
