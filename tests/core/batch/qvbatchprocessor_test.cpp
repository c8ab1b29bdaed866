#include "core/batch/qvbatchprocessor.h"

#include <sys/stat.h>

#include <atomic>
#include <set>
#include <thread>

#include "builtin/decoders/wavdec.h"
#include "core/engine/modules/builtinplugin_p.h"
#include "core/engine/modules/qvmodule.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/threads/qvthreads.h"
#include "core/preset/qvpresetmgr.h"
#include "tests/core/batch/batch_fixture.h"

class QvBatchProcessorTest : public BatchTest {
  protected:
    // Runs the list to its end on a thread of its own.
    void runAll() {
        processor_.init(list_);
        ASSERT_EQ(processor_.start(false, &notes_), 0);
        notes_.waitFor("end");
        processor_.stop();
    }
    std::string message(std::size_t i) const { return i < notes_.messages.size() ? notes_.messages[i] : "-"; }

    BatchNotes notes_;
    QvBatchList list_;
    QvBatchProcessor processor_;
};

TEST_F(QvBatchProcessorTest, ReportsTasksInOrderOnEitherThread) {
    for (int i = 0; i < 3; ++i) list_.append(good(i));
    list_.setTaskEnabled(1, false);
    list_.append(task("out3.x", {missing()}));
    list_.append(task("no/folder/out4.x", {wav_}));
    list_.append(good(5));
    const std::string expected =
        "begin "
        "task0 init0.0:0 seg0.0 segdone0.0:0 done0:0 skipped1 "
        "task2 init2.0:0 seg2.0 segdone2.0:0 done2:0 "
        "task3 done3:-1 "
        "task4 init4.0:0 seg4.0 segdone4.0:-1 done4:-1 "
        "task5 init5.0:0 seg5.0 segdone5.0:0 done5:0 end";
    LogCapture log;
    runAll();
    EXPECT_EQ(notes_.take(), expected);
    EXPECT_FALSE(isWritten(1));
    EXPECT_TRUE(isWritten(5));
    EXPECT_EQ(message(2), "Failed to open file '" + folder_.file("missing.wav") + "' in input segment 0");
    EXPECT_NE(message(3), "");
    EXPECT_EQ(message(3), processor_.errorDesc().asString());
    EXPECT_EQ(processor_.errorCode(), -1);
    EXPECT_EQ(processor_.currentTask(), 5);
    EXPECT_FALSE(processor_.isRunning());
    EXPECT_EQ(notes_.progressed.front(), 0);
    for (const double part : notes_.progressed) EXPECT_TRUE(part >= 0 && part <= 1) << part;

    const struct {
        const char* text;
        int mask, count;
    } lines[] = {
        {"Batch Transcoder thread started", QvLogMask::debug, 1},
        {"Batch Transcoder thread exited", QvLogMask::debug, 1},
        {"BatchProcessor: Task #1 disabled, skipping.", QvLogMask::debug, 1},
        {"BatchProcessor: Restoring task #0 from state...", QvLogMask::debug, 1},
        {"[BatchProcessor] Processing task #1...", QvLogMask::info, 1},
        {"[BatchProcessor] Task #1 done.", QvLogMask::info, 1},
        {"[BatchProcessor] Task #2: transcoding started...", QvLogMask::debug, 1},
        {"[BatchProcessor] Task #2: transcoding done.", QvLogMask::info, 1},
        {"BatchProcessor: Failed to restore task #3 from state.", QvLogMask::error, 1},
        {"[BatchProcessor] Task #3 failed.", QvLogMask::error, 1},
        {"[BatchProcessor] Task #4: transcoding failed.", QvLogMask::error, 1},
        {"[BatchProcessor] Task #4 done.", QvLogMask::info, 1},
    };
    for (const auto& line : lines) EXPECT_EQ(log.count(line.text, line.mask), line.count) << line.text;

    EXPECT_EQ(processor_.start(true, &notes_), 0);
    EXPECT_EQ(notes_.take(), expected);
    EXPECT_EQ(processor_.start(true, nullptr), 0);
    EXPECT_EQ(QvBatchProcessor().run(), 0);
}

TEST_F(QvBatchProcessorTest, AnEmptyListBeginsAndEnds) {
    runAll();
    EXPECT_EQ(notes_.take(), "begin end");
    EXPECT_EQ(processor_.start(true, &notes_), 0);
    EXPECT_EQ(notes_.take(), "begin end");
}

TEST_F(QvBatchProcessorTest, LeavesOutSegmentsAsTheOptionsSay) {
    QvTaskState joined = task("out0.x", {wav_, missing(), wav_, wav_});
    joined.setSegmentEnabled(2, false);
    list_.append(joined);
    QvTaskState off = task("out1.x", {wav_, wav_});
    off.setSegmentEnabled(0, false);
    off.setSegmentEnabled(1, false);
    list_.append(off);
    EXPECT_EQ(processor_.options(), 3);
    runAll();
    EXPECT_EQ(notes_.take(), "begin task0 done0:-1 task1 done1:-1 end");
    EXPECT_NE(message(0).find("missing.wav' in input segment 1"), std::string::npos) << message(0);
    EXPECT_EQ(processor_.errorCode(), -15);

    processor_.setOptions(1);
    list_.remove(1);
    runAll();
    EXPECT_EQ(notes_.take(),
              "begin task0 init0.0:0 init0.1:-1 init0.2:1 init0.3:0 seg0.0 segdone0.0:0 seg0.3 "
              "segdone0.3:0 done0:0 end");
    int parts = 0;
    for (const int sample : samples(TempFolder::read(outputs(0).at(0)).substr(44))) parts += sample == 7;
    EXPECT_EQ(parts, 9600);

    processor_.setOptions(0);
    list_.setTaskEnabled(0, false);
    list_.replace(0, task("out2.x", {wav_}));
    list_.setTaskEnabled(0, false);
    runAll();
    EXPECT_EQ(notes_.take(), "begin task0 init0.0:0 seg0.0 segdone0.0:0 done0:0 end");
}

// A stored task with any of its values missing or of another type is a task that failed, or one that still
// can be run, and those after it are run.
TEST_F(QvBatchProcessorTest, DamagedTasksFailAlone) {
    const QvTaskState sound = task("out.x", {wav_, wav_});
    std::vector<std::string> paths;
    const std::function<void(const Any&, const std::string&)> collect = [&](const Any& value,
                                                                            const std::string& path) {
        if (!path.empty()) paths.push_back(path);
        const std::string prefix = path.empty() ? "" : path + ".";
        if (value.isVector())
            for (int i = 0; i < value.asVector().size(); ++i)
                collect(value.asVector().at(i), prefix + std::to_string(i));
        if (value.isDict())
            for (const auto& [key, inside] : value.asDict()) collect(*inside, prefix + key);
    };
    collect(Any(static_cast<const AnyDict&>(sound)), "");
    ASSERT_GT(paths.size(), 40u);
    // A text is taken for the name of the output too.
    const Any wrong[] = {Any(),
                         Any(-7),
                         Any(folder_.file("wrong").c_str()),
                         Any(AnyVector()),
                         Any(AnyDict("name", 3)),
                         Any(Pair(9, 9))};
    for (const std::string& path : paths)
        for (const Any& value : wrong) {
            QvTaskState damaged = sound;
            *damaged.descendant("%s", path.c_str()) = value;
            list_.append(damaged);
        }
    list_.append(QvTaskState());
    static_cast<AnyVector&>(list_).append(Any(5));
    static_cast<AnyVector&>(list_).append(Any("text"));
    list_.append(good(9));
    processor_.init(list_);
    EXPECT_EQ(processor_.start(true, &notes_), 0);
    EXPECT_EQ(notes_.count(" task") + notes_.count(" skipped"), list_.size());
    EXPECT_EQ(notes_.count(" task"), notes_.count(" done"));
    EXPECT_EQ(message(notes_.messages.size() - 2), "This element of the list is no task");
    EXPECT_TRUE(isWritten(9));
    const std::string last = " done" + std::to_string(list_.size() - 1) + ":0 end";
    EXPECT_EQ(notes_.all().substr(notes_.all().size() - last.size()), last);
    std::set<std::string> nameless;
    for (const std::string& text : notes_.messages)
        if (text.find("ssertion") != std::string::npos) nameless.insert(text);
    EXPECT_EQ(nameless, std::set<std::string>()) << "these do not say what is wrong";
}

TEST_F(QvBatchProcessorTest, ADamagedTaskSaysWhere) {
    const struct {
        const char* path;
        Any value;
        const char* message;
    } damages[] = {
        {"__class__", Any("Other"), "This element of the list is no task"},
        {"encoder", Any(), "encoder: it holds no settings"},
        {"encoder.streams", Any(AnyVector()), "encoder/streams: it is missing or empty"},
        {"streams", Any(3), "streams: it is missing or empty"},
        {"streams.0", Any(3), "streams/1: it holds no settings"},
        {"streams.0.type", Any(3), "streams/1/type: it is no type of stream"},
        {"streams.0.type", Any(1), "streams/1/type: it is not that of the encoder's stream"},
        {"streams.0.sources", Any(), "streams: none has a source"},
        {"streams.0.sources.1", Any(3), "streams/1/sources/2: it is no source"},
        {"streams.0.sources.1.file", Any(""), "streams/1/sources/2/file: it is no file name"},
        {"streams.0.sources.1.stream", Any(Pair(2, -1)),
         "streams/1/sources/2/stream: it is no stream of the output's type"},
        {"streams.0.sources.1.process", Any(AnyDict("inOutPoints", AnyVector(1, 2))),
         "streams/1/sources/2/process/inOutPoints: it holds no pairs of times"},
        {"files.0.filename", Any(3), "files/1/filename: it is no file name"},
        {"segments", Any(3), "segments: it is no list"},
    };
    QvTaskState sound = task("out.x", {wav_, wav_});
    for (const char* place : {"streams.0.sources.0", "streams.0.sources.1"})
        sound.descendant("%s", place)->asDict().set("process", AnyDict("x", 1));
    for (const auto& row : damages) {
        QvTaskState damaged = sound;
        *damaged.descendant("%s", row.path) = row.value;
        list_.append(damaged);
    }
    runAll();
    for (std::size_t i = 0; i < std::size(damages); ++i) EXPECT_EQ(message(i), damages[i].message);
    EXPECT_EQ(processor_.errorCode(), -13);
}

namespace {

// Sound files whose decoder notes when a run asks whether their data can be passed on as they are.
class AskedWav : public WavDec {
  public:
    static inline std::atomic<int> asked{0};
    using WavDec::getParam;
    void getParam(const char* name, Any& value) const override {
        if (std::string(name) == "srParams") ++asked;
        WavDec::getParam(name, value);
    }
};

struct AskedWavModule : QvModule {
    AskedWavModule() : QvModule(QvModuleType::decoder, "wavdec", "notes questions", "WAV") {}
    QvCodec* create() override { return _setAttrs(new AskedWav); }
};

}  // namespace

TEST_F(QvBatchProcessorTest, SmartRenderingIsAWishForTheTasksThatFollow) {
    qv_registry()->cleanup();
    QvPlugin plugin("asked", "A decoder in front of the built-in one");
    plugin.addModule(new AskedWavModule);
    qv_registry()->addPlugin(&plugin);
    qv_registry()->addPlugin(qvBuiltinPlugin());
    qvPresetMgr()->update();
    const AnyDict file =
        entry(wav_.getString("filename"), AnyDict("name", "wavdec", "filename", wav_.get("filename")));
    for (const char* name : {"out0.x", "out1.x", "out2.x"}) list_.append(task(name, {file}));
    processor_.init(list_);
    std::vector<int> asked;
    notes_.hook = [&](const std::string& text) {
        if (text == "done0:0") processor_.setSmartRender(true);
        if (text == "done1:0") processor_.setSmartRender(false);
        if (text.rfind("done", 0) == 0) asked.push_back(AskedWav::asked.exchange(0));
    };
    EXPECT_EQ(processor_.start(true, &notes_), 0);
    EXPECT_EQ(asked, (std::vector<int>{0, 1, 0})) << notes_.all();
    qv_registry()->cleanup();
}

// --- Stop and pause.

TEST_F(QvBatchProcessorTest, StopEndsATaskAndTheRun) {
    list_.append(good(0));
    list_.append(good(1));
    const char* aborted = "begin task0 init0.0:0 seg0.0 segdone0.0:2 done0:2 end";
    notes_.when("seg0.0", [&] { processor_.stop(); });
    runAll();
    EXPECT_EQ(notes_.take(), aborted) << "from a callback";
    EXPECT_EQ(processor_.start(true, &notes_), 0);
    EXPECT_EQ(notes_.take(), aborted) << "in a synchronous run";

    notes_.when("seg0.0", [&] { processor_.pause(); });
    LogCapture log;
    ASSERT_EQ(processor_.start(false, &notes_), 0);
    notes_.waitFor("paused");
    EXPECT_EQ(processor_.stop(), 0);
    EXPECT_EQ(notes_.take(), "begin task0 init0.0:0 seg0.0 paused resumed segdone0.0:2 done0:2 end")
        << "from another thread, while paused";
    EXPECT_TRUE(log.contains("[BatchProcessor] Task #0: transcoding aborted.", QvLogMask::info));

    notes_.hook = nullptr;
    runAll();
    EXPECT_EQ(notes_.count(":0 end"), 1) << "a stop is not for the next run";
}

// Nobody reads the pipe that is the output.
TEST_F(QvBatchProcessorTest, StopEndsTheWaitForAReader) {
    const std::string pipe = folder_.file("out0.raw");
    ASSERT_EQ(mkfifo(pipe.c_str(), 0600), 0);
    const std::unique_ptr<QvEncodePipe> output(QvEncodePipe::create());
    output->clearStreams();
    output->addAudioStream("rawaenc");
    ASSERT_EQ(output->setParam("muxer/exactName", 1), 0);
    AnyDict encoder;
    output->store(encoder);
    QvTaskState stuck = task("out0.raw", {wav_});
    stuck.set("encoder", encoder);
    list_.append(stuck);
    list_.append(good(1));
    processor_.init(list_);
    ASSERT_EQ(processor_.start(false, &notes_), 0);
    notes_.waitFor("seg0.0");
    EXPECT_EQ(processor_.stop(), 0);
    EXPECT_EQ(notes_.take(), "begin task0 init0.0:0 seg0.0 segdone0.0:2 done0:2 end");
    EXPECT_EQ(message(0), "");
}

TEST_F(QvBatchProcessorTest, LongVideosReportEveryHundredFrames) {
    const auto reports = [this](int frames, double to) {
        const AnyDict file = film("film.yuv", frames, 0, QvFramerate::f25p(), width, height);
        QvBatchList list;
        list.append(task("out0.x", {file}, qvVideoStream, cut(0, to)));
        processor_.init(list);
        notes_.progressed.clear();
        EXPECT_EQ(processor_.start(true, &notes_), 0);
        return static_cast<int>(notes_.progressed.size());
    };
    EXPECT_EQ(reports(1200, 48), 12);
    EXPECT_DOUBLE_EQ(notes_.progressed.at(3), 0.25);
    EXPECT_EQ(reports(1000, 40), 100);
    EXPECT_EQ(reports(1200, 16), 100) << "only the part that is taken counts";
}

TEST_F(QvBatchProcessorTest, TheLengthOfJoinedVideosCountsAsAWhole) {
    const auto part = [this](const char* name) {
        return film(name, 600, 0, QvFramerate::f25p(), width, height);
    };
    list_.append(task("out0.x", {part("a.yuv"), part("b.yuv")}, qvVideoStream));
    processor_.init(list_);
    EXPECT_EQ(processor_.start(true, &notes_), 0);
    EXPECT_EQ(notes_.progressed.size(), 12u);
    EXPECT_EQ(notes_.take(),
              "begin task0 init0.0:0 init0.1:0 seg0.0 segdone0.0:0 seg0.1 segdone0.1:0 done0:0 end");
}

TEST_F(QvBatchProcessorTest, APauseWithinATaskHoldsIt) {
    list_.append(good(0));
    processor_.init(list_);
    bool afterwards = true;
    notes_.hook = [&](const std::string& text) {
        if (text == "seg0.0") processor_.pause();
        if (text == "segdone0.0:0") afterwards = processor_.isPaused();
    };
    ASSERT_EQ(processor_.start(false, &notes_), 0);
    notes_.waitFor("paused");
    EXPECT_TRUE(processor_.isPaused());
    EXPECT_TRUE(processor_.isRunning());
    processor_.unpause();
    notes_.waitFor("end");
    EXPECT_FALSE(afterwards);
    EXPECT_FALSE(processor_.isPaused());
    EXPECT_EQ(notes_.take(), "begin task0 init0.0:0 seg0.0 paused resumed segdone0.0:0 done0:0 end");
}

TEST_F(QvBatchProcessorTest, APauseBetweenTasksLeavesOutTheOneThatWasDue) {
    for (int i = 0; i < 3; ++i) list_.append(good(i));
    processor_.init(list_);
    notes_.when("done0:0", [&] { processor_.pause(); });
    ASSERT_EQ(processor_.start(false, &notes_), 0);
    notes_.waitFor("paused");
    EXPECT_FALSE(isWritten(1));
    processor_.unpause();
    notes_.waitFor("end");
    processor_.stop();
    EXPECT_EQ(notes_.take(),
              "begin task0 init0.0:0 seg0.0 segdone0.0:0 done0:0 paused resumed "
              "task2 init2.0:0 seg2.0 segdone2.0:0 done2:0 end");
    EXPECT_FALSE(isWritten(1));
}

TEST_F(QvBatchProcessorTest, AssertsMisuse) {
    const char *starting = "BatchProcessor: must not call start() while running()",
               *pausing = "Must not pause/resume in synchronous mode";
    list_.append(good(0));
    processor_.init(list_);
    std::vector<std::string> failures;
    notes_.hook = [&](const std::string& text) {
        if (text == "end") {
            failures.push_back(failureOf([&] { processor_.start(true, nullptr); }));
            failures.push_back(failureOf([&] { processor_.run(); }));
        }
        if (text != "task0") return;
        failures.push_back(failureOf([&] { processor_.init(list_); }));
        failures.push_back(failureOf([&] { processor_.start(false, &notes_); }));
        failures.push_back(failureOf([&] { processor_.run(); }));
        failures.push_back(failureOf([&] { processor_.pause(); }));
        failures.push_back(failureOf([&] { processor_.unpause(); }));
    };
    EXPECT_EQ(processor_.start(true, &notes_), 0);
    const char* running = "BatchProcessor: must not call run() while running()";
    EXPECT_EQ(failures, (Texts{"BatchProcessor: must not call init() while running", starting, running,
                               pausing, pausing, starting, running}));
    LogCapture log;
    const char* required = "BatchProcessor: Must specify callback interface in asynchronous mode.";
    EXPECT_EQ(failureOf([&] { processor_.start(false, nullptr); }), required);
    EXPECT_TRUE(log.contains(required, QvLogMask::error));
    EXPECT_EQ(notes_.count(" done0:0 end"), 1);
}

TEST_F(QvBatchProcessorTest, ACallbackThatThrowsEndsTheRun) {
    QvTaskState off = good(0);
    off.setEnabled(false);
    list_.append(off);
    list_.append(task("out1.x", {wav_, wav_}));
    list_.append(good(2));
    processor_.init(list_);
    for (const bool synchronous : {true, false})
        for (const char* where : {"begin", "skipped0", "task1", "init1.0:0", "seg1.0", "progress",
                                  "segdone1.0:0", "seg1.1", "segdone1.1:0", "done1:0", "end"}) {
            notes_.take();
            notes_.when(where, [&] { throw std::runtime_error(std::string("thrown in ") + where); });
            const int result = processor_.start(synchronous, &notes_);
            EXPECT_EQ(result, synchronous ? -1 : 0) << where;
            notes_.waitFor("end");
            processor_.stop();
            const std::string all = notes_.all();
            EXPECT_EQ(notes_.count("task"), notes_.count(" done")) << all;
            EXPECT_EQ(notes_.count("end"), 1) << all;
            EXPECT_EQ(notes_.count("task2"), std::string(where) == "end" ? 1 : 0) << all;
            EXPECT_STREQ(processor_.errorDesc().asString(),
                         (std::string("A callback failed: thrown in ") + where).c_str());
            EXPECT_EQ(processor_.errorCode(), -1);
        }
    notes_.when("task1", [] { throw 5; });
    EXPECT_EQ(processor_.start(true, &notes_), -1);
    EXPECT_EQ(processor_.errorDesc(), "A callback failed: unknown exception");
}

TEST_F(QvBatchProcessorTest, WithoutAThreadNothingRuns) {
    list_.append(good(0));
    processor_.init(list_);
    LogCapture log;
    {
        NoThreads none;
        const PlatformScope scope(none);
        EXPECT_EQ(processor_.start(false, &notes_), -1);
    }
    EXPECT_TRUE(log.contains("[BatchProcessor] *** Failed to spawn processing thread", QvLogMask::error));
    EXPECT_FALSE(processor_.isRunning());
    EXPECT_EQ(notes_.take(), "");
    EXPECT_EQ(processor_.stop(), 0);
    runAll();
    EXPECT_EQ(notes_.count(" done0:0 end"), 1);
}

TEST_F(QvBatchProcessorTest, StopsAndPausesAtAnyMoment) {
    for (int i = 0; i < 4; ++i) list_.append(good(i));
    processor_.init(list_);
    unsigned seed = 1;
    const auto random = [&seed](unsigned below) {
        return (seed = seed * 1664525u + 1013904223u) / 65536 % below;
    };
    const auto spin = [&] {
        for (unsigned i = random(40); i > 0; --i) QVThreads::sleep(0);
    };
    for (int run = 0; run < 100; ++run) {
        ASSERT_EQ(processor_.start(false, &notes_), 0);
        for (unsigned k = random(4); k > 0; --k) {
            spin();
            processor_.pause();
            spin();
            processor_.isPaused();
            processor_.errorDesc();
            processor_.currentSegment();
            if (random(2)) processor_.unpause();
        }
        spin();
        std::thread second;
        if (random(3) == 0) second = std::thread([this] { processor_.stop(); });
        processor_.stop();
        if (second.joinable()) second.join();
        const std::string all = notes_.take();
        ASSERT_FALSE(processor_.isRunning());
        ASSERT_EQ(all.rfind("begin", 0), 0u) << all;
        ASSERT_EQ(all.substr(all.size() - 3), "end") << all;
    }
    {
        QvBatchProcessor left;
        left.init(list_);
        left.start(false, &notes_);
    }
    EXPECT_EQ(notes_.count("end"), 1) << "the destructor ends a run first";
}
