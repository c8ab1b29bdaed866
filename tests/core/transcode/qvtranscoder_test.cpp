#include <gtest/gtest.h>

#include <thread>

#include "builtin/modules.h"
#include "core/transcode/translink.h"
#include "tests/core/transcode/transcode_fixture.h"
#include "tests/support/fake_filters.h"
#include "tests/support/log_capture.h"
#include "tests/support/platform_scope.h"
#include "tests/support/temp_folder.h"

namespace {

class AsfMuxer : public QvMuxer {
  public:
    int open() override { return 0; }
    int close() override { return 0; }
    const char* name() const override { return "asfmux"; }
    int setParam(const char* name, const Any& value) override {
        given.set(name, value);
        return 0;
    }
    QvBufStream* addStream(int, const AnyDict&) override { return nullptr; }
    void removeStreams(int) override {}
    void removeStream(int, int) override {}
    int nrStreams(int) const override { return 0; }
    QvBufStream* stream(int, int) const override { return nullptr; }
    AnyDict given;
};

class Transcoder : public testing::Test {
  protected:
    Transcoder() { plugin.audio("aquant").add(new QvAfModule); }
    FakePlugin plugin;
};

TEST_F(Transcoder, SoundFollowsThePictureAndTheOutputIsClosedBeforeTheEnd) {
    Job job;
    job.linkBoth();
    AsfMuxer muxer;
    job.pipe.muxer = &muxer;
    job.decoder.extra.set("meta", AnyDict("title", "x", "startTimecode", "00:00:02:05"));
    NotedTranscoder t(job.events, &job.task);
    EXPECT_EQ(t.getState(), QvTranscoder::connected);
    LogCapture log;
    EXPECT_EQ(t.transcode(true), 0);
    EXPECT_EQ(job.events.take(), "open open v0 a1920 0.00 v1 a1920 0.50 muxclose close done0");
    EXPECT_EQ(t.getState(), QvTranscoder::connected);
    EXPECT_EQ(t.errorCode(), 0);
    EXPECT_EQ(muxer.given.getInt32("_totalFrames"), 2);
    EXPECT_EQ(muxer.given.get("meta").asDict().getString("title"), std::string("x"));
    EXPECT_EQ(muxer.given.getInt32("timecodeOffset"), 55);
    EXPECT_EQ(job.pipe.video.params.getInt32("timecodeOffset"), 55);
    EXPECT_TRUE(log.contains("Profile: n/a", QvLogMask::debug));
    EXPECT_TRUE(log.contains("Muxer: asfmux (asfmux)", QvLogMask::debug));
    EXPECT_TRUE(log.contains("[transcoder] cbMuxClose() returned", QvLogMask::info));
}

TEST_F(Transcoder, AnAudioOnlyRunEndsAtTheLastSample) {
    Job job(25);
    job.pipe.videoStreams = 0;
    ASSERT_EQ(job.task.link(&job.decoder, 2, 0, 0), 0);
    NotedTranscoder t(job.events, &job.task);
    t.setParam("progress", AnyDict("off", 1));
    EXPECT_EQ(t.transcode(true), 0);
    const std::string text = job.events.take();
    EXPECT_EQ(text.substr(0, 15), "open open a2000");
    EXPECT_EQ(job.pipe.audios[0]->total, 48000);
    EXPECT_EQ(t.rounds, 24);

    Job silent;
    silent.pipe.videoStreams = 0;
    silent.decoder.tracks[0]->params.set("samples", 0LL);
    ASSERT_EQ(silent.task.link(&silent.decoder, 2, 0, 0), 0);
    NotedTranscoder none(silent.events, &silent.task);
    EXPECT_EQ(none.transcode(true), 0);
    EXPECT_EQ(silent.events.take(), "open open 0.00 close done0");
}

// How a run ends and who gets to know what.
TEST_F(Transcoder, EveryEndHasItsOwnResult) {
    const struct {
        const char* what;
        std::function<void(Job&, NotedTranscoder&)> arrange;
        int result, errorCode;
        const char* end;
    } rows[] = {
        {"command", [](Job& j, auto&) { j.task.setPostprocessCommand("exit 3"); }, 0, 0,
         "close post:exit 3 done3"},
        {"stopped",
         [](Job& j, auto& t) {
             j.task.setPostprocessCommand("exit 3");
             t.onProcess = [] { return 1; };
         },
         0, 0, "close done1"},
        {"encoder", [](Job& j, auto&) { j.pipe.video.result = -7; }, -7, -1, "v0 abort done-7"},
        {"sound", [](Job& j, auto&) { j.pipe.audios[0]->result = -9; }, -9, -1, "a1920 abort done-9"},
        {"picture ends", [](Job& j, auto&) { j.pipe.video.result = -4; }, 0, 0, "v0 a1920 close done-4"},
        {"source", [](Job& j, auto&) { j.decoder.failAt = 0; }, -1, -1, "abort done-1"},
        {"close", [](Job& j, auto&) { j.pipe.closeResult = -77; }, -77, -1, "close done-77"},
        {"left open", [](Job&, auto& t) { t.setParam("closeEncoder", 0); }, 0, 0, "0.50 done0"},
        {"callback throws", [](Job&, auto& t) { t.onProcess = []() -> int { throw 5; }; }, -1, -1,
         "abort done-1"},
        {"callback asserts", [](Job&, auto& t) { t.onProcess = [&t] { return t.pause(); }; }, -1, -1,
         "abort done-1"},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(row.what);
        Job job;
        job.linkBoth();
        NotedTranscoder t(job.events, &job.task);
        row.arrange(job, t);
        EXPECT_EQ(t.transcode(true), row.result);
        EXPECT_EQ(t.errorCode(), row.errorCode);
        EXPECT_STREQ(t.errorDesc(), row.errorCode ? "Error in processing" : "");
        const std::string text = job.events.take();
        EXPECT_TRUE(text.ends_with(row.end)) << text;
        EXPECT_EQ(t.getState(), QvTranscoder::connected);
        for (int i = 0; i < job.task.nrLinks(); ++i)
            EXPECT_EQ(job.task.getLink(i)->open(nullptr), 0) << "left open";
    }
}

TEST_F(Transcoder, WhatCantBeOpenedIsToldAndCanBeMended) {
    const struct {
        std::function<void(Job&)> breakIt, mend;
        int code;
        const char* text;
        const char* events;
    } rows[] = {
        {[](Job& j) { j.pipe.audios[0]->params.set("samplerate", 0); },
         [](Job& j) { j.pipe.audios[0]->params.set("samplerate", 48000); }, -1, "Can not open transcode link",
         ""},
        {[](Job& j) { j.decoder.seekResult = -1; }, [](Job& j) { j.decoder.seekResult = 0; }, -1,
         "Seek input video #0 to 0.000000 failed, aborting", ""},
        {[](Job& j) { j.pipe.openResult = -77; }, [](Job& j) { j.pipe.openResult = 0; }, -77, "open failed",
         "open"},
        {[](Job& j) { j.pipe.video.params.set("nrViews", 2); },
         [](Job& j) { j.pipe.video.params.set("nrViews", 1); }, -1,
         "Source contains only 1 view(s), encoder requires multi-view source with 2 views.", ""},
    };
    for (const auto& row : rows)
        for (const bool synchronous : {true, false}) {
            SCOPED_TRACE(row.text);
            Job job;
            job.linkBoth();
            NotedTranscoder t(job.events, &job.task);
            row.breakIt(job);
            EXPECT_EQ(t.transcode(synchronous), row.code);
            EXPECT_EQ(t.errorCode(), row.code);
            EXPECT_STREQ(t.errorDesc(), row.text);
            EXPECT_EQ(t.getState(), QvTranscoder::connected);
            EXPECT_EQ(job.events.take(), row.events);
            row.mend(job);
            EXPECT_EQ(t.transcode(true), 0);
            EXPECT_EQ(t.errorCode(), 0);
            EXPECT_EQ(job.pipe.audios[0]->total, 3840);
        }
}

TEST_F(Transcoder, MisuseAsserts) {
    Events events;
    NotedTranscoder t(events);
    EXPECT_EQ(t.getState(), QvTranscoder::notConnected);
    EXPECT_EQ(t.stop(), 0);
    EXPECT_EQ(assertion([&] { t.transcode(true); }), "Transcoder.transcode: Encoder not set!");
    EXPECT_EQ(assertion([&] { t.linkAll(); }), "Transcoder.linkAll: decoder and/or encoder not specified");
    EXPECT_EQ(assertion([&] { t.pause(); }),
              "Transcoder: must not call pause/unpause() in synchronous mode.");
    EXPECT_EQ(assertion([&] { t.filter(1, 0, "scaler", 0); }),
              "QvTranscoder::filter has to be called from the cbProgress() or cbProcess()");
    Job job;
    job.linkBoth();
    NotedTranscoder busy(job.events, &job.task);
    int asserted = 0;
    busy.onProcess = [&] {
        for (const auto& work : std::vector<std::function<void()>>{
                 [&] { busy.setEncoder(&job.pipe); }, [&] { busy.setDecoder(&job.decoder); },
                 [&] { busy.linkAll(); }, [&] { busy.unlink(); }, [&] { busy.transcode(false); },
                 [&] { busy.transcode(t.task(), true); }, [&] { busy.pause(); }, [&] { busy.unpause(); },
                 [&] { busy.link(&job.decoder, 1, 0, 0); }})
            asserted += assertion(work) != "";
        EXPECT_EQ(busy.filter(1, 0, "scaler", 0), nullptr);
        EXPECT_EQ(busy.filter(1, 7, "scaler", 0), nullptr);
        return 0;
    };
    EXPECT_EQ(busy.transcode(true), 0);
    EXPECT_EQ(asserted, 2 * 9);
    EXPECT_EQ(busy.task(), &job.task);
}

TEST_F(Transcoder, LinksAreMadeThroughItsTask) {
    Job job;
    NotedTranscoder t(job.events);
    t.setEncoder(&job.pipe);
    t.setDecoder(&job.decoder);
    EXPECT_EQ(t.linkAll(), 0);
    EXPECT_EQ(t.nrLinks(), 2);
    EXPECT_EQ(t.getState(), QvTranscoder::connected);
    EXPECT_EQ(t.link(&job.decoder, 1, 0, 1), -1);
    EXPECT_NE(std::string(t.errorDesc()).find("already linked to encoder video#0"), std::string::npos);
    FakeDecoder sound(2, QvFramerate::f25p());
    sound.audio(3840, 48000);
    t.setAudioDecoder(&sound);
    EXPECT_EQ(t.getState(), QvTranscoder::notConnected);
    EXPECT_EQ(t.linkAll(), 0);
    EXPECT_EQ(t.linkedTo(&sound, 2, 0), 0);
    EXPECT_EQ(t.linkedTo(&job.decoder, 2, 0), -1);
    EXPECT_EQ(t.transcode(true), 0);
    t.unlink();
    EXPECT_EQ(t.getState(), QvTranscoder::notConnected);
}

TEST_F(Transcoder, Parameters) {
    Job job;
    NotedTranscoder t(job.events, &job.task);
    EXPECT_THROW(t.setParam("colour", 1), QvParamException);
    LogCapture log;
    EXPECT_EQ(t.setParam("chapters", 5), 0);
    EXPECT_TRUE(
        log.contains("Transcoder: Setting global 'chapterPoints', using ProcessParams is recommended.",
                     QvLogMask::warning));
    EXPECT_EQ(t.setParam("connMatrix", AnyVector(Any(1), Any(2))), 0);
    EXPECT_TRUE(log.contains("Setting global 'connMatrix' parameter, using", QvLogMask::warning));
    EXPECT_EQ(t.setParam("progress", AnyDict("each", 1)), 0);
    const auto get = [&](const char* name) {
        Any value;
        t.getParam(name, value);
        return value;
    };
    EXPECT_EQ(get("connMatrix").asVector().size(), 2);
    EXPECT_EQ(get("progress").asDict().getInt32("each"), 1);
    EXPECT_EQ(t.setParam("progress", 1), 0);
    EXPECT_TRUE(get("progress").asDict().empty());
    EXPECT_TRUE(get("secondPass").isFalse());
    EXPECT_EQ(t.setParam("twoPass", 1), 0);
    EXPECT_TRUE(get("secondPass").isTrue());
    for (const char* name : {"deadLock", "srPossible", "writeLogfile"})
        EXPECT_TRUE(get(name).isFalse()) << name;
}

TEST_F(Transcoder, ALogFileHoldsTheMessagesOfTheRunAlone) {
    TempFolder folder;
    Job job;
    job.linkBoth();
    job.pipe.filename = folder.file("x.raw").c_str();
    NotedTranscoder t(job.events, &job.task);
    t.setParam("writeLogfile", 1);
    t.onProcess = [] { return qv_log()->info("half way"), 0; };
    EXPECT_EQ(t.transcode(true), 0);
    qv_log()->info("over");
    const std::string text = TempFolder::read(folder.file("x.raw.log"));
    EXPECT_NE(text.find("half way"), std::string::npos);
    EXPECT_EQ(text.find("over"), std::string::npos);
}

TEST_F(Transcoder, AFullDiscIsLoggedAndEndsOnlyARunThatWatchesIt) {
    FullDisc disc(0);
    PlatformScope scope(disc);
    AsfMuxer muxer;
    for (const bool watched : {false, true}) {
        Job job;
        job.linkBoth();
        job.pipe.filename = "/tmp/x.raw";
        if (watched) job.pipe.muxer = &muxer;
        NotedTranscoder t(job.events, &job.task);
        LogCapture log;
        EXPECT_EQ(t.transcode(true), watched ? -1 : 0);
        EXPECT_EQ(log.count("Encode Error. Target disk full."), 1);
        const std::string text = job.events.take();
        EXPECT_TRUE(text.ends_with(watched ? "v0 a1920 muxclose abort done-1" : "close done0")) << text;
    }
}

// --- On a worker -------------------------------------------------------------------------------------

TEST_F(Transcoder, AWorkerDoesTheSameWork) {
    Job job;
    job.linkBoth();
    NotedTranscoder t(job.events, &job.task);
    LogCapture log;
    for (int run = 0; run < 2; ++run) {
        EXPECT_EQ(t.transcode(false), 0);
        job.events.waitFor("done0");
        t.stop();
        EXPECT_EQ(job.events.take(), "open open v0 a1920 0.00 v1 a1920 0.50 close done0");
    }
    EXPECT_EQ(log.count("Transcoder thread started", QvLogMask::debug), 2);
    EXPECT_EQ(log.count("Transcoder thread exiting", QvLogMask::debug), 2);
}

TEST_F(Transcoder, PausesBetweenSteps) {
    Job job(1000000);
    job.pipe.quiet = job.pipe.sound->quiet = true;
    job.linkBoth();
    NotedTranscoder t(job.events, &job.task);
    t.setParam("progress", AnyDict("off", 1));
    ASSERT_EQ(t.transcode(false), 0);
    for (int i = 0; i < 3; ++i) {
        EXPECT_EQ(t.pause(), 0);
        job.events.waitFor("paused");
        EXPECT_TRUE(t.isPaused());
        const int rounds = t.rounds;
        std::this_thread::yield();
        EXPECT_EQ(t.rounds, rounds);
        EXPECT_EQ(t.unpause(), 0);
        job.events.waitFor("resumed");
        EXPECT_FALSE(t.isPaused());
        job.events.take();
    }
    t.pause();
    job.events.waitFor("paused");
    t.stop();  // of a paused run
    EXPECT_FALSE(t.isTranscoding());
    EXPECT_TRUE(job.events.take().ends_with("resumed close done1"));
}

TEST_F(Transcoder, StopEndsARunFromWhereverItComes) {
    Job job(1000000);
    job.pipe.quiet = job.pipe.sound->quiet = true;
    job.linkBoth();
    NotedTranscoder t(job.events, &job.task);
    t.setParam("progress", AnyDict("off", 1));
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
    Job job;
    job.linkBoth();
    NotedTranscoder t(job.events, &job.task);
    int left = 3;
    t.onDone = [&] {
        if (left-- > 0)
            EXPECT_EQ(t.transcode(left % 2 == 0), 0);
        else
            job.events.add("finished");
    };
    ASSERT_EQ(t.transcode(false), 0);
    job.events.waitFor("finished");
    t.stop();
    EXPECT_EQ(t.getState(), QvTranscoder::connected);
    EXPECT_EQ(job.pipe.audios[0]->total, 4 * 3840);
}

TEST_F(Transcoder, WithoutAThreadNothingHangs) {
    Job job;
    job.linkBoth();
    NotedTranscoder t(job.events, &job.task);
    {
        NoThreads none;
        PlatformScope scope(none);
        EXPECT_EQ(t.transcode(false), -1);
        EXPECT_STREQ(t.errorDesc(), "Failed to spawn processing thread");
        EXPECT_EQ(t.getState(), QvTranscoder::transcoding);
        EXPECT_EQ(job.events.take(), "open abort");
        EXPECT_EQ(t.transcode(true), 0);
        EXPECT_EQ(t.transcode(false), -1);
    }
    EXPECT_EQ(t.stop(), 0);
    EXPECT_EQ(t.getState(), QvTranscoder::connected);
    job.events.take();
    EXPECT_EQ(t.transcode(false), 0);
    job.events.waitFor("done0");
}

TEST_F(Transcoder, ABorrowedTaskIsGivenBack) {
    Job job, other;
    job.linkBoth();
    other.linkBoth();
    NotedTranscoder t(job.events, &job.task);
    EXPECT_EQ(t.transcode(&other.task, true), 0);
    EXPECT_EQ(t.task(), &job.task);
    EXPECT_EQ(other.pipe.audios[0]->total, 3840);

    t.onDone = [&] { EXPECT_EQ(t.task(), &other.task); };
    EXPECT_EQ(t.transcode(&other.task, false), 0);
    t.stop();
    EXPECT_EQ(t.task(), &job.task);
    t.onDone = nullptr;

    other.pipe.openResult = -1;
    for (const bool synchronous : {true, false}) EXPECT_EQ(t.transcode(&other.task, synchronous), -1);
    other.task.setEncoder(nullptr);
    EXPECT_NE(assertion([&] { t.transcode(&other.task, true); }), "");
    NoThreads none;
    PlatformScope scope(none);
    other.task.setEncoder(&other.pipe);
    other.pipe.openResult = 0;
    EXPECT_EQ(t.transcode(&other.task, false), -1);
    EXPECT_EQ(t.task(), &job.task);
}

}  // namespace
