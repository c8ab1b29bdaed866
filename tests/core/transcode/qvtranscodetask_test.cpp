#include "builtin/modules.h"
#include "core/transcode/translink.h"
#include "tests/core/transcode/transcode_fixture.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/fake_filters.h"
#include "tests/support/temp_folder.h"
#include "tests/support/test_stream.h"
#include "tests/support/wav_bytes.h"

namespace {

TEST(TaskLink, JoinsEachStreamOnce) {
    Job job;
    QvTask& task = job.task;
    EXPECT_EQ(task.link(&job.decoder, 2, 0, 0), 0);
    EXPECT_EQ(task.link(&job.decoder, 1, 0, 0), 1);
    EXPECT_EQ(task.link(&job.decoder, 1, 0, 0), 0);  // stands already
    EXPECT_EQ(task.nrLinks(), 2);
    EXPECT_EQ(task.decoders().size(), 1);
    EXPECT_EQ(task.link(&job.decoder, 1, 0, 3), -1);
    EXPECT_TRUE(std::string(task.errorDesc()).ends_with("video#0 already linked to encoder video#0"));
    EXPECT_EQ(task.getLink(2, 0), task.getLink(0));
    EXPECT_EQ(task.getLink(2, 1), nullptr);
    EXPECT_EQ(task.getLinkForOutput(1, 0), task.getLink(1));
    EXPECT_EQ(task.indexOfLink(task.getLink(1)), 1);
    EXPECT_EQ(task.indexOfLink(nullptr), -1);
    EXPECT_EQ(failureOf([&] { task.getLink(2); }), "TransLink.linkAt: index out of range");
    EXPECT_EQ(failureOf([&] { task.linkedTo(nullptr, 1, 0); }), "Task.linkedTo: invalid argument");
    task.unlink();
    EXPECT_EQ(task.nrLinks() + task.decoders().size(), 0);
}

TEST(TaskLink, WhatCantBeJoinedIsTold) {
    Events events;
    struct Unopened : FakeDecoder {
        using FakeDecoder::FakeDecoder;
        int open() override { return setError(-9, "no such file"); }
        int select(int, int) override { return -1; }
        void opened() { setState(static_cast<State>(3)); }
    } decoder(1, QvFramerate::f25p());
    NotedPipe pipe(events, QvFramerate::f25p());
    QvTask task;
    EXPECT_EQ(failureOf([&] { task.link(&decoder, 1, 0, 0); }),
              "Transcoder.link: failed, encoder is not set");
    EXPECT_EQ(failureOf([&] { task.link(&decoder); }), "Task.link: encoder not specified");
    task.setEncoder(&pipe);
    EXPECT_EQ(failureOf([&] { task.link(nullptr, 1, 0, 0); }), "Transcoder.link: invalid argument: dp is 0");
    EXPECT_EQ(failureOf([&] { task.link(nullptr); }), "Task.link: invalid argument");
    EXPECT_EQ(task.link(&decoder, 1, 0, 0), -9);
    EXPECT_STREQ(task.errorDesc(), "no such file");
    decoder.opened();
    decoder.isOn = false;
    EXPECT_EQ(task.link(&decoder, 1, 0, 0), -1);
    EXPECT_TRUE(std::string(task.errorDesc()).starts_with("Task.link: select() failed on ("));
    decoder.isOn = true;
    EXPECT_EQ(task.link(&decoder, 1, 0, 5), -1);
    EXPECT_TRUE(std::string(task.errorDesc()).starts_with("Can not initialize link: decoder ("));
    EXPECT_EQ(task.nrLinks() + task.decoders().size(), 0);
    LogCapture log;
    EXPECT_EQ(task.link(&decoder, 4, 0, 0), 0);
    EXPECT_TRUE(log.contains("Task.link: don't know how to link subpic streams", QvLogMask::warning));
    decoder.audio(1, 48000).audio(1, 48000);
    EXPECT_EQ(failureOf([&] { task.link(&decoder); }), "Invalid encoder stream audio#1");
}

TEST(TaskLink, AllStreamsAtOnceAndTheirOutputsEnabled) {
    Job job;
    job.linkBoth();
    TestStream picture, sound, spare;
    job.pipe.audio(48000);
    int index = 0;
    for (auto* stream : {&picture, &sound, &spare}) {
        job.pipe.streamAt(index++)->bitstream = stream;
        stream->setEnabled(true);
    }
    EXPECT_EQ(job.task.link(&job.decoder), 0);
    EXPECT_EQ(job.task.nrLinks(), 2);
    EXPECT_EQ(job.task.getLink(0)->type(), 1);
    EXPECT_TRUE(picture.enabled() && sound.enabled() && !spare.enabled());
    job.task.unlink();
    EXPECT_FALSE(picture.enabled() || sound.enabled() || spare.enabled());
}

TEST(TaskLink, CaptionsJoinAVideoLink) {
    Job job;
    FakeDecoder captions(1, QvFramerate::f25p());
    const auto meta = [&](QvDecodePipe* decoder, int type) {
        return failureOf([&] { EXPECT_EQ(job.task.linkMeta(decoder, type, 2, 1, 0), 0); });
    };
    EXPECT_EQ(meta(nullptr, 4), "Transcoder.linkMeta: invalid argument: dp is 0");
    EXPECT_EQ(meta(&captions, 1), "Transcoder.linkMeta: invalid argument: type is not QV_SUBPIC_CC");
    EXPECT_EQ(meta(&captions, 4),
              "Transcoder.linkMeta: invalid state: Can not link meta before video stream is linked");
    job.linkBoth();
    EXPECT_EQ(meta(&captions, 4), "no failure");
    EXPECT_EQ(job.task.decoders().size(), 2);
    EXPECT_EQ(job.task.getLink(0)->metaSource(0), &captions);
    EXPECT_EQ(job.task.getLink(0)->metaSourceStreamNr(0), 2);
    job.task.setEncoder(nullptr);
    EXPECT_EQ(meta(&captions, 4), "Transcoder.linkMeta: failed, encoder is not set");
}

const AnyVector points(Any(MediaTime(1.0)), Any(MediaTime(2.0)));
const AnyVector otherPoints(Any(MediaTime(3.0)), Any(MediaTime(4.0)));

TEST(TaskParams, EachTypeTakesItsOwn) {
    QvTask task;
    const struct {
        const char* key;
        Any value;
        int mask;
        const char* failure;
    } rows[] = {
        {"inOutPoints", points, 0, "no failure"},
        {"smartRender", 1, 2, "no failure"},
        {"smartRender", 0, 2, "no failure"},  // leaves what is there
        {"filters", AnyDict("x", 1), 255,
         "QvTask.setProcessParams: cannot apply filters for ALL stream types"},
        {"chapters", AnyVector(Any(1)), 2,
         "QvTask.setProcessParams: cannot apply chapterPoints to non-video stream"},
        {"audioChannelMap", AnyVector(Any(1)), 1,
         "QvTask.setProcessParams: cannot apply channelMap to non-audio stream"},
    };
    for (const auto& row : rows)
        EXPECT_EQ(
            failureOf([&] { task.setProcessParams(ProcessParams(AnyDict(row.key, row.value)), row.mask); }),
            row.failure);
    for (int type : {1, 2, 4})
        EXPECT_EQ(task.processParams(type).get("inOutPoints").asVector().size(), 2) << type;
    EXPECT_EQ(task.processParams(2).getInt32("smartRender"), 1);
    EXPECT_FALSE(task.processParams(1).isSet("smartRender"));
    task.clearProcessParams(1);
    EXPECT_TRUE(task.processParams(1).empty());
    EXPECT_FALSE(task.processParams(2).empty());
    EXPECT_THROW(task.processParams(3), QvAssertFailure);
}

TEST(TaskParams, ALinksOwnWinOverTheTasks) {
    Job job;
    ProcessParams own(AnyDict("inOutPoints", points, "chapters", AnyVector(Any(5)), "smartRender", 2));
    own.set("filters", AnyDict());
    ASSERT_EQ(job.task.link(&job.decoder, 1, 0, 0, own), 0);
    ASSERT_EQ(job.task.link(&job.decoder, 2, 0, 0), 1);
    job.task.setProcessParams(ProcessParams(AnyDict("inOutPoints", otherPoints, "smartRender", 1)), 0);
    job.task.setProcessParams(ProcessParams(AnyDict("filters", AnyDict("a", 1))), 1);
    job.task.setProcessParams(
        ProcessParams(AnyDict("filters", AnyDict("b", 1), "audioChannelMap", AnyVector(Any(7)))), 2);
    AnyVector params;
    QvTask::makeOpenParams(job.task, job.task.links(), params);
    EXPECT_EQ(params, AnyVector(Any(AnyDict("inOutPoints", points, "chapters", AnyVector(Any(5)),
                                            "smartRender", 1, "effects", AnyDict("a", 1))),
                                Any(AnyDict("inOutPoints", otherPoints, "smartRender", 1, "audioEffects",
                                            AnyDict("b", 1), "connMatrix", AnyVector(Any(7))))));
}

TEST(TaskChecks, StreamsAndViews) {
    EXPECT_EQ(QvTask().checkStreams(), -1);
    Job job;
    job.linkBoth();
    EXPECT_EQ(job.task.checkStreams(), 0);
    job.decoder.video.set("nrViews", 3);
    job.pipe.video.params.set("nrViews", 2);
    LogCapture log;
    EXPECT_EQ(job.task.checkStreams(), 0);
    job.pipe.video.params.set("nrViews", 3);
    EXPECT_EQ(job.task.checkStreams(), 0);
    EXPECT_TRUE(
        log.contains("Source contains 3 views and encoder requires 2, views above 2 will be discarded.",
                     QvLogMask::warning));
    job.pipe.video.params.set("nrViews", 4);
    EXPECT_EQ(job.task.checkStreams(), -20);
    EXPECT_STREQ(job.task.errorDesc(),
                 "Source contains only 3 view(s), encoder requires multi-view source with 4 views.");
}

struct DolbyEncoder : FakeAudioEncoder {
    const char* name() const override { return "ddaenc"; }
};

TEST(TaskChecks, CodedSoundThatPassesThrough) {
    const AnyDict filters("customFilters", AnyVector(Any(AnyDict("name", "again", "_on", 1)),
                                                     Any(AnyDict("name", "srconvert", "_on", 1)),
                                                     Any(AnyDict("name", "adelay", "_on", 0))));
    const AnyDict coded("a", 1);
    const struct {
        Any srParams, srPossible;
        bool filtered;
        int result;
        const char* text;
    } rows[] = {
        {Any(), 0, false, 0, ""},
        {-1, 0, false, -11, "Decoder does not support smart rendering"},
        {-16, 0, false, -16, "Decoder does not support smart rendering"},
        {coded, 0, false, 0, ""},
        {coded, -1, false, -11, ""},
        {coded, -16, false, -16, ""},
        {coded, 0, true, -11,
         "Not possible to use audio filters when both input and output audio formats are Dolby. "
         "Please remove following filters: again"},
    };
    FakePlugin plugin;
    plugin.audio("aquant").add(new QvAfModule);
    for (const auto& row : rows) {
        Job job;
        auto encoder = std::make_unique<DolbyEncoder>();
        encoder->params = job.pipe.audios[0]->params;
        encoder->params.set("srPossible", row.srPossible);
        job.pipe.audios[0] = std::move(encoder);
        job.decoder.tracks[0]->params.set("codec", "Dolby");
        if (row.srParams.isValid()) job.decoder.extra.set("srParams", row.srParams);
        job.linkBoth();
        if (row.filtered) job.task.getLink(1)->setProcessParams(ProcessParams(AnyDict("filters", filters)));
        AnyVector messages;
        EXPECT_EQ(job.task.checkLegal(messages), row.result);
        ASSERT_EQ(messages.size(), row.result ? 1 : 0);
        EXPECT_STREQ(row.result ? messages.at(0).asString() : "", row.text);
        NotedTranscoder t(job.events, &job.task);
        if (row.result == QvStatus::notLegal) {
            EXPECT_EQ(t.transcode(true), QvStatus::notLegal);
        }
        if (row.result == QvStatus::warning) {
            t.transcode(true);
            t.onProcess = [] { return 1; };
            EXPECT_EQ(t.transcode(false), QvStatus::warning);
            t.stop();
        }
        EXPECT_EQ(t.errorCode(), row.result);
        EXPECT_STREQ(t.errorDesc(), row.text);
    }
}

TEST(TaskChecks, PicturesThatPassThrough) {
    Job job;
    EXPECT_EQ(job.task.checkSmartRender(nullptr), 0);
    job.linkBoth();
    EXPECT_EQ(job.task.checkSmartRender(nullptr), 0);
    job.decoder.extra.set("srParams", AnyDict("x", 1));
    EXPECT_EQ(job.task.checkSmartRender(nullptr), 0);
    job.pipe.video.params.set("srPossible", 1);
    AnyDict found;
    EXPECT_EQ(job.task.checkSmartRender(&found), 1);
    EXPECT_EQ(found, AnyDict("vids", AnyVector(Any(0)), "auds", AnyVector(), "subs", AnyVector()));
    EXPECT_EQ(job.task.checkMultiPass(nullptr), 0);
    job.pipe.video.params.set("twoPassPossible", 1);
    TPtrList<TransLink> links;
    EXPECT_EQ(job.task.checkMultiPass(&links), 1);
    EXPECT_EQ(links.at(0), job.task.getLink(0));
}

// --- As a dictionary ---------------------------------------------------------------------------------

// A WAV file into raw sound.
struct Stored {
    Stored() {
        input = folder.write("in.wav", riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) +
                                            wavChunk("data", patternBytes(480 * 4))));
        std::unique_ptr<QvEncodePipe> made(QvEncodePipe::create());
        made->clearStreams();
        made->addAudioStream(Any("rawaenc"));
        made->setParam("audio0", AnyDict("samplerate", 48000, "channels", 2, "bitsPerSample", 16));
        made->setFilename(Any(folder.file("out.pcm").c_str()));
        made->store(encoder);
        state = AnyDict("__version__", "2.0", "__class__", "TranscodeTask", "encoder", encoder, "files",
                        AnyVector(Any(AnyDict("filename", input.c_str()))), "postProcess", "true %i");
        setStream(2, input, 0,
                  AnyDict("inOutPoints", AnyVector(Any(MediaTime(0.001)), Any(MediaTime(0.006)))));
    }
    ~Stored() { decoders.deleteAll(); }
    void setStream(int type, const std::string& file, int number, const AnyDict& process) {
        const AnyDict source("file", file.c_str(), "stream", Any(Pair(2, number)), "process", process);
        state.set("streams", AnyVector(Any(AnyDict("type", type, "sources", AnyVector(Any(source))))));
    }
    void setFile(const AnyDict& file) { state.set("files", AnyVector(Any(file), Any(7))); }
    // The text of the failure, or "no failure" and a task.
    std::string restore() {
        QvEncodePipe* made = nullptr;
        Any error;
        const std::string failure =
            failureOf([&] { task.reset(QvTask::fromState(state, decoders, &made, 0, nullptr, &error)); });
        pipe.reset(made);
        return error.isString() ? error.asString() : failure;
    }
    FailingOutputs modules;
    TempFolder folder;
    std::string input;
    AnyDict encoder, state;
    QvDPipeList decoders;
    std::unique_ptr<QvEncodePipe> pipe;
    std::unique_ptr<QvTask> task;
};

TEST(TaskState, ComesBackAsItWas) {
    Stored stored;
    ASSERT_EQ(stored.restore(), "no failure");
    ASSERT_TRUE(stored.task);
    ASSERT_EQ(stored.task->nrLinks(), 1);
    EXPECT_EQ(stored.task->encoder(), stored.pipe.get());
    EXPECT_EQ(stored.decoders.size(), 1);
    AnyDict again, third;
    stored.task->store(again);
    EXPECT_EQ(again.get("streams"), stored.state.get("streams"));
    EXPECT_EQ(again.get("postProcess"), stored.state.get("postProcess"));
    EXPECT_EQ(again.get("filename").asString(), stored.folder.file("out.pcm"));
    stored.task.reset();
    stored.decoders.deleteAll();
    stored.state = again;
    ASSERT_EQ(stored.restore(), "no failure");
    stored.task->store(third);
    EXPECT_EQ(third, again);
    Events events;
    NotedTranscoder t(events, stored.task.get());
    EXPECT_EQ(t.transcode(true), 0);
    EXPECT_EQ(events.take(), "0.00 muxclose post:true '" + stored.input + "' done0");
    const Any files = stored.pipe->getMuxer()->getParam("filenames");
    ASSERT_EQ(files.asVector().size(), 1);
    const std::string written = TempFolder::read(files.asVector().at(0).asString());
    EXPECT_TRUE(
        written.ends_with("data" + leBytes(240 * 4, 4) + patternBytes(480 * 4).substr(48 * 4, 240 * 4)));
}

TEST(TaskState, DamageIsToldAndNothingIsLeft) {
    const char* const broken = "Task.restore: Invalid task state structure";
    const char* const unopened = "Task.restore: no input file(s) successfully opened";
    const struct {
        void (*damage)(Stored&);
        std::string text;  // "": any
    } rows[] = {
        {[](Stored& s) { s.state.set("__class__", "BatchList"); }, broken},
        {[](Stored& s) { s.state.set("__version__", 2); }, broken},
        {[](Stored& s) { s.state.remove("streams"); }, std::string(broken) + " - no output streams"},
        {[](Stored& s) { s.state.remove("encoder"); }, std::string(broken) + " - missing encoder settings"},
        {[](Stored& s) {
             s.encoder.set("muxer", AnyDict("name", "gone"));
             s.state.set("encoder", s.encoder);
         },
         ""},
        {[](Stored& s) { s.state.remove("files"); },
         "Task.restore: invalid task state structure - no input file(s) specified"},
        {[](Stored& s) { s.setFile(AnyDict("filename", "/nowhere.wav")); }, unopened},
        {[](Stored& s) {
             s.setFile(AnyDict("filename", s.input.c_str(), "decoder", AnyDict("name", "gone")));
         },
         unopened},
        {[](Stored& s) { s.setStream(1, s.input, 0, {}); }, ""},
        {[](Stored& s) { s.setStream(2, s.input, 9, {}); }, ""},
        {[](Stored& s) { s.setStream(2, "/other.wav", 0, {}); },
         "no available decoders, decoder must be cloned..."},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        Stored stored;
        row.damage(stored);
        const std::string text = stored.restore();
        EXPECT_NE(text, "no failure");
        if (row.text != "") {
            EXPECT_EQ(text, row.text);
        }
        EXPECT_FALSE(stored.task);
        EXPECT_FALSE(stored.pipe);
    }
}

TEST(TaskState, AnOutputWithoutSourceStaysFree) {
    Stored stored;
    stored.state.set("streams", AnyVector(Any(AnyDict("type", 2))));
    LogCapture log;
    EXPECT_EQ(stored.restore(), "no failure");
    ASSERT_TRUE(stored.task);
    EXPECT_EQ(stored.task->nrLinks(), 0);
    EXPECT_TRUE(log.contains("QvTask::restore: No source(s) defined for stream 0", QvLogMask::warning));
}

TEST(TaskTemplate, TakesWhatTheSourceHas) {
    Stored stored;
    FakeDecoder decoder(3, QvFramerate::f25p());
    decoder.audio(10, 48000).audio(10, 48000);
    stored.setStream(
        2, "x", 0,
        AnyDict("filters", AnyDict("customFilters", AnyVector()), "smartRender", 1, "inOutPoints", points));
    LogCapture log;
    std::unique_ptr<QvTask> task(QvTask::fromStateWithSource(stored.state, &decoder, 2));
    ASSERT_TRUE(task);
    std::unique_ptr<QvEncodePipe> pipe(task->encoder());
    EXPECT_EQ(task->nrLinks(), 1);
    EXPECT_EQ(log.count("[Task] fromStateWithSource - input contains more streams than required by output.",
                        QvLogMask::warning),
              2);
    EXPECT_TRUE(task->getLink(0)->processParams().isSet("filters"));
    EXPECT_FALSE(task->getLink(0)->processParams().isSet("inOutPoints"));
    EXPECT_EQ(task->processParams(2).getInt32("smartRender"), 1);
    EXPECT_STREQ(task->postprocessCommand().asString(), "true %i");
    task.reset();

    // Outputs that the source can't feed go.
    FakeDecoder silent(3, QvFramerate::f25p());
    task.reset(QvTask::fromStateWithSource(stored.state, &silent, 2));
    ASSERT_TRUE(task);
    pipe.reset(task->encoder());
    EXPECT_EQ(pipe->nrStreams() + task->nrLinks(), 0);
    task.reset();
}

}  // namespace
