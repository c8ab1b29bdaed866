#include "builtin/modules.h"
#include "core/transcode/link/translink.h"
#include "tests/core/transcode/transcode_fixture.h"
#include "tests/support/failing_codecs.h"
#include "tests/support/fake_filters.h"
#include "tests/support/wav_bytes.h"

namespace {

const AnyVector points(Any(MediaTime(1.0)), Any(MediaTime(2.0)));
const AnyVector otherPoints(Any(MediaTime(3.0)), Any(MediaTime(4.0)));

TEST(TaskParams, ALinksOwnWinOverTheTasks) {
    Job job;
    ProcessParams own(AnyDict("inOutPoints", points, "chapters", AnyVector(Any(5)), "smartRender", 2));
    own.setHoldLast(true);
    own.set("filters", AnyDict());
    ASSERT_EQ(job.task.link(&job.decoder, qvVideoStream, 0, 0, own), 0);
    ASSERT_EQ(job.task.link(&job.decoder, qvAudioStream, 0, 0), 1);
    job.task.setProcessParams(ProcessParams(AnyDict("inOutPoints", otherPoints, "smartRender", 1)), 0);
    job.task.setProcessParams(ProcessParams(AnyDict("filters", AnyDict("a", 1))), 1);
    job.task.setProcessParams(
        ProcessParams(AnyDict("filters", AnyDict("b", 1), "audioChannelMap", AnyVector(Any(7)),
                              "audioConversion", AnyDict("dither", "triangular"))),
        2);
    AnyVector params;
    QvTask::makeOpenParams(job.task, job.task.links(), params);
    EXPECT_EQ(params, AnyVector(Any(AnyDict("inOutPoints", points, "chapters", AnyVector(Any(5)),
                                            "smartRender", 1, "effects", AnyDict("a", 1), "holdLast", 1)),
                                Any(AnyDict("inOutPoints", otherPoints, "smartRender", 1, "audioEffects",
                                            AnyDict("b", 1), "connMatrix", AnyVector(Any(7)),
                                            "audioConversion", AnyDict("dither", "triangular")))));
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
        {-16, 0, false, -16, "Decoder does not support smart rendering"},
        {coded, -1, false, -11, ""},
        {coded, -16, false, -16, ""},
        {coded, 0, true, -11,
         "Not possible to use audio filters when both input and output audio formats are Dolby. "
         "Please remove following filters: again."},
    };
    FakePlugin plugin;
    plugin.audio("aquant").add(new QvAfModule);
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
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
        const bool runs = row.result != QvStatus::notLegal;
        for (const bool synchronous : {true, false}) {
            NotedTranscoder t(job.events, &job.task);
            ASSERT_EQ(t.transcode(synchronous), runs && synchronous ? 0 : row.result);
            if (runs) job.events.waitFor("close done0");
            EXPECT_EQ(job.events.take().empty(), !runs);
            EXPECT_EQ(t.errorCode(), row.result) << "a warning stays";
            EXPECT_STREQ(t.errorDesc(), row.text);
        }
    }
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
        setStream(qvAudioStream, input, 0,
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
    AnyDict again, third;
    stored.task->store(again);
    EXPECT_EQ(again.get("streams"), stored.state.get("streams"));
    EXPECT_EQ(again.get("postProcess"), stored.state.get("postProcess"));
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
        {[](Stored& s) { s.state.remove("encoder"); }, std::string(broken) + " - missing encoder settings"},
        {[](Stored& s) {
             s.encoder.set("muxer", AnyDict("name", "gone"));
             s.state.set("encoder", s.encoder);
         },
         ""},
        {[](Stored& s) { s.state.remove("files"); },
         "Task.restore: invalid task state structure - no input file(s) specified"},
        {[](Stored& s) { s.setFile(AnyDict("filename", "/nowhere.wav")); }, unopened},
        {[](Stored& s) { s.setStream(qvVideoStream, s.input, 0, {}); }, ""},
        {[](Stored& s) { s.setStream(qvAudioStream, "/other.wav", 0, {}); },
         "no available decoders, decoder must be cloned..."},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        Stored stored;
        row.damage(stored);
        const std::string text = stored.restore();
        EXPECT_NE(text, "no failure");
        if (!row.text.empty()) {
            EXPECT_EQ(text, row.text);
        }
        EXPECT_FALSE(stored.task);
        EXPECT_FALSE(stored.pipe);
    }
}

TEST(TaskTemplate, TakesWhatTheSourceHas) {
    Stored stored;
    FakeDecoder decoder(3, QvFramerate::f25p());
    decoder.audio(10, 48000).audio(10, 48000);
    stored.setStream(
        2, "x", 0,
        AnyDict("filters", AnyDict("customFilters", AnyVector()), "smartRender", 1, "inOutPoints", points));
    std::unique_ptr<QvTask> task(QvTask::fromStateWithSource(stored.state, &decoder, 2));
    ASSERT_TRUE(task);
    std::unique_ptr<QvEncodePipe> pipe(task->encoder());
    EXPECT_EQ(task->nrLinks(), 1);
    EXPECT_TRUE(task->getLink(0)->processParams().isSet("filters"));
    EXPECT_FALSE(task->getLink(0)->processParams().isSet("inOutPoints"));
    EXPECT_EQ(task->getLink(0)->processParams().smartRender(), 1);
    EXPECT_EQ(task->processParams(2).smartRender(), 0) << "not of all sounds";
    AnyVector open;
    QvTask::makeOpenParams(*task, task->links(), open);
    EXPECT_EQ(open.at(0).asDict().get("smartRender"), Any(1));
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
