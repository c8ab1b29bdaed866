#include <new>
#include <thread>

#include "builtin/modules.h"
#include "core/transcode/link/translink.h"
#include "tests/core/transcode/transcode_fixture.h"
#include "tests/support/fake_filters.h"

namespace {

class Transcoder : public testing::Test {
  protected:
    Transcoder() { plugin.audio("aquant").add(new QvAfModule); }
    FakePlugin plugin;
};

TEST_F(Transcoder, SoundFollowsThePictureAndTheOutputIsClosedBeforeTheEnd) {
    LinkedJob job;
    job.decoder.extra.set("meta", AnyDict("title", "x", "startTimecode", "00:00:02:05"));
    EXPECT_EQ(job.t.transcode(true), 0);
    EXPECT_EQ(job.events.take(), "open open v0 a1920 0.00 v1 a1920 0.50 close done0");
    EXPECT_EQ(job.pipe.video.params.getInt32("timecodeOffset"), 55);
}

struct Resampler : FakeAudioFilter {
    using FakeAudioFilter::FakeAudioFilter;
    int open() override {
        ratio = 1.0 * known.getInt32("outSamplerate") / known.getInt32("inSamplerate");
        return FakeAudioFilter::open();
    }
};

// To the sample, also where no whole number of them fits a frame and where the rate is converted.
TEST_F(Transcoder, EachFrameBringsItsSamples) {
    const struct {
        QvRatio rate;
        int frames, inRate, outRate;
        long long samples;
    } rows[] = {
        {{30000, 1001}, 119, 48000, 48000, 190590},
        {{30000, 1001}, 119, 44100, 44100, 175104},
        {{60000, 1001}, 601, 32000, 44100, 442176},
        {{15, 2}, 31, 11025, 11025, 45570},
    };
    plugin.add(new FakeModule<Resampler>(QvModuleType::audioFilter, "srconvert"));
    for (const auto& row : rows) {
        FakeDecoder decoder(row.frames, QvFramerate(row.rate));
        decoder.audio(1LL << 30, row.inRate);
        Events events;
        NotedPipe pipe(events, QvFramerate(row.rate));
        pipe.quiet = pipe.sound->quiet = true;
        pipe.sound->params.set("samplerate", row.outRate);
        QvTask task;
        task.setEncoder(&pipe);
        EXPECT_EQ(task.link(&decoder, qvVideoStream, 0, 0) + task.link(&decoder, qvAudioStream, 0, 0), 1);
        NotedTranscoder t(events, &task);
        t.onProcess = [&] {
            const auto written = static_cast<long long>(pipe.video.numbers.size());
            EXPECT_EQ(pipe.sound->total, written * row.outRate * row.rate.den / row.rate.num);
            return 0;
        };
        EXPECT_EQ(t.transcode(true), 0) << t.errorDesc();
        EXPECT_EQ(pipe.sound->total, row.samples) << row.inRate << " to " << row.outRate;
    }
}

// How a run ends, and which callbacks get which result.
TEST_F(Transcoder, EveryEndHasItsOwnResult) {
    const struct {
        std::function<void(LinkedJob&)> arrange;
        int result, errorCode;
        const char* end;
    } rows[] = {
        {[](LinkedJob& j) { j.task.setPostprocessCommand("exit 3"); }, 0, 0, "close post:exit 3 done3"},
        {[](LinkedJob& j) {
             j.task.setPostprocessCommand("exit 3");
             j.t.onProcess = [] { return 1; };
         },
         0, 0, "close done1"},
        {[](LinkedJob& j) { j.pipe.video.result = -7; }, -7, -1, "v0 abort done-7"},
        {[](LinkedJob& j) { j.pipe.audios[0]->result = -9; }, -9, -1, "a1920 abort done-9"},
        // A writer that takes no more pictures ends the run well.
        {[](LinkedJob& j) { j.pipe.video.result = -4; }, 0, 0, "v0 a1920 close done-4"},
        {[](LinkedJob& j) { j.decoder.failAt = 0; }, -1, -1, "abort done-1"},
        {[](LinkedJob& j) { j.pipe.closeResult = -77; }, -77, -1, "close done-77"},
        {[](LinkedJob& j) {
             j.t.setParam("audioEffects",
                          AnyDict("customFilters",
                                  AnyVector(Any(AnyDict("name", "aquant", "_on", 1, "refuseClose", -78)))));
         },
         -78, -1, "close done-78"},
        {[](LinkedJob& j) { j.t.setParam("closeEncoder", 0); }, 0, 0, "0.50 done0"},
        {[](LinkedJob& j) { j.t.onProcess = []() -> int { throw 5; }; }, -1, -1, "abort done-1"},
        {[](LinkedJob& j) { j.t.onProcess = []() -> int { throw std::bad_alloc(); }; }, -3, -1,
         "abort done-3"},
        {[](LinkedJob& j) { j.t.onProcess = []() -> int { throw QvMemoryFailure("x"); }; }, -3, -1,
         "abort done-3"},
        {[](LinkedJob& j) { j.t.onProcess = []() -> int { throw QvAssertFailure("x"); }; }, -1, -1,
         "abort done-1"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        LinkedJob job;
        row.arrange(job);
        EXPECT_EQ(job.t.transcode(true), row.result);
        EXPECT_EQ(job.t.errorCode(), row.errorCode);
        EXPECT_STREQ(job.t.errorDesc(), row.errorCode ? "Error in processing" : "");
        const std::string text = job.events.take();
        EXPECT_TRUE(text.ends_with(row.end)) << text;
        EXPECT_EQ(job.t.getState(), QvTranscoder::connected);
        for (int i = 0; i < 2; ++i) EXPECT_EQ(job.task.getLink(i)->open(nullptr), 0) << "left open";
    }
}

TEST_F(Transcoder, WhatCantBeOpenedIsToldAndCanBeMended) {
    const struct {
        void (*set)(Job&, bool broken);
        int code;
        const char* text;
        const char* events;
    } rows[] = {
        {[](Job& j, bool broken) { j.pipe.audios[0]->params.set("samplerate", broken ? 0 : 48000); }, -1,
         "Can not open transcode link: Could not get 'samplerate' from encoder", ""},
        {[](Job& j, bool broken) { j.decoder.seekResult = -broken; }, -1,
         "Seek input video #0 to 0.000000 failed, aborting", ""},
        {[](Job& j, bool broken) { j.pipe.openResult = -77 * broken; }, -77, "open failed", "open"},
        {[](Job& j, bool broken) { j.pipe.video.params.set("nrViews", 1 + broken); }, -1,
         "Source contains only 1 view(s), encoder requires multi-view source with 2 views.", ""},
    };
    for (const auto& row : rows)
        for (const bool synchronous : {true, false}) {
            SCOPED_TRACE(row.text);
            LinkedJob job;
            row.set(job, true);
            EXPECT_EQ(job.t.transcode(synchronous), row.code);
            EXPECT_EQ(job.t.errorCode(), row.code);
            EXPECT_STREQ(job.t.errorDesc(), row.text);
            EXPECT_EQ(job.t.getState(), QvTranscoder::connected);
            EXPECT_EQ(job.events.take(), row.events);
            row.set(job, false);
            EXPECT_EQ(job.t.transcode(true), 0);
            EXPECT_EQ(job.t.errorCode(), 0);
            EXPECT_EQ(job.pipe.audios[0]->total, 3840);
        }
}

TEST_F(Transcoder, ALogFileHoldsTheMessagesOfTheRunAlone) {
    TempFolder folder;
    LinkedJob job;
    job.pipe.filename = folder.file("x.raw").c_str();
    job.t.setParam("writeLogfile", 1);
    job.t.onProcess = [] { return qv_log()->info("half way"), 0; };
    EXPECT_EQ(job.t.transcode(true), 0);
    qv_log()->info("over");
    const std::string text = TempFolder::read(folder.file("x.raw.log"));
    EXPECT_NE(text.find("half way"), std::string::npos);
    EXPECT_EQ(text.find("over"), std::string::npos);
}

TEST_F(Transcoder, AFullDiscIsLoggedAndEndsOnlyARunThatWatchesIt) {
    FullDisc disc(0);
    PlatformScope scope(disc);
    FakeMuxer muxer("asfmux");
    for (const bool watched : {false, true}) {
        LinkedJob job;
        job.pipe.filename = "/tmp/x.raw";
        if (watched) job.pipe.muxer = &muxer;
        LogCapture log;
        EXPECT_EQ(job.t.transcode(true), watched ? -1 : 0);
        EXPECT_EQ(log.count("Encode Error. Target disk full."), 1);
        const std::string text = job.events.take();
        EXPECT_TRUE(text.ends_with(watched ? "v0 a1920 muxclose abort done-1" : "close done0")) << text;
    }
}

// --- On a worker -------------------------------------------------------------------------------------

TEST_F(Transcoder, PausesBetweenSteps) {
    LinkedJob job(1000000);
    job.beQuiet();
    ASSERT_EQ(job.t.transcode(false), 0);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(job.t.pause(), 0);
        job.events.waitFor("paused");
        EXPECT_TRUE(job.t.isPaused());
        const int rounds = job.t.rounds;
        std::this_thread::yield();
        EXPECT_EQ(job.t.rounds, rounds);
        EXPECT_EQ(job.t.unpause(), 0);
        job.events.waitFor("resumed");
        EXPECT_FALSE(job.t.isPaused());
        job.events.take();
    }
    job.t.pause();
    job.events.waitFor("paused");
    job.t.stop();  // of a paused run
    EXPECT_TRUE(job.events.take().ends_with("resumed close done1"));
}

TEST_F(Transcoder, StopEndsARunFromWhereverItComes) {
    LinkedJob job(1000000);
    job.beQuiet();
    auto& t = job.t;
    // From a callback, on the caller's thread and on a worker.
    t.onProcess = [&] { return t.stop(); };
    EXPECT_EQ(t.transcode(true), 0);
    ASSERT_EQ(t.transcode(false), 0);
    job.events.waitFor("done1 open open close done1");
    t.onProcess = nullptr;
    t.stop();
    // From two other threads at once.
    for (const bool synchronous : {true, false}) {
        job.events.take();
        t.rounds = 0;
        std::thread stoppers[2];
        for (auto& stopper : stoppers)
            stopper = std::thread([&] {
                while (t.rounds == 0) std::this_thread::yield();
                t.stop();
                EXPECT_FALSE(t.isTranscoding());
            });
        EXPECT_EQ(t.transcode(synchronous), 0);
        for (auto& stopper : stoppers) stopper.join();
        t.stop();
        EXPECT_EQ(job.events.take(), "open open close done1");
    }
    // Before its first step, and by the destructor.
    t.setParam("startDelay", 10000);
    ASSERT_EQ(t.transcode(false), 0);
    EXPECT_TRUE(t.isTranscoding());
}

TEST_F(Transcoder, TheEndOfOneRunCanStartTheNext) {
    LinkedJob job;
    int left = 3;
    job.t.onDone = [&] {
        if (left-- > 0)
            EXPECT_EQ(job.t.transcode(left % 2 == 0), 0);
        else
            job.events.add("finished");
    };
    ASSERT_EQ(job.t.transcode(false), 0);
    job.events.waitFor("finished");
    job.t.stop();
    EXPECT_EQ(job.t.getState(), QvTranscoder::connected);
    EXPECT_EQ(job.pipe.audios[0]->total, 4 * 3840);
}

TEST_F(Transcoder, WithoutAThreadNothingHangs) {
    LinkedJob job;
    {
        NoThreads none;
        PlatformScope scope(none);
        EXPECT_EQ(job.t.transcode(false), QvStatus::failed);
        EXPECT_STREQ(job.t.errorDesc(), "Failed to spawn processing thread");
        EXPECT_EQ(job.t.getState(), QvTranscoder::transcoding);
        EXPECT_EQ(job.events.take(), "open abort");
        EXPECT_EQ(job.t.transcode(true), 0);
        EXPECT_EQ(job.t.transcode(false), QvStatus::failed);
    }
    EXPECT_EQ(job.t.stop(), 0);
    EXPECT_EQ(job.t.getState(), QvTranscoder::connected);
    job.events.take();
    EXPECT_EQ(job.t.transcode(false), 0);
    job.events.waitFor("done0");
}

}  // namespace
