#include "core/transcode/batch/qvbatchtask.h"

#include <random>

#include "core/document/xmldom.h"
#include "core/engine/status.h"
#include "core/transcode/batch/qvbatchdecoder.h"
#include "core/transcode/batch/qvtaskfile.h"
#include "core/transcode/link/translink.h"
#include "tests/core/transcode/batch/joinedtask.h"

namespace {

const QvFramerate f25 = QvFramerate::f25p(), f50 = QvFramerate::f50p();

std::vector<int> steps(int first, int count, int step = 1) {
    std::vector<int> all;
    for (int i = 0; i < count; ++i) all.push_back(first + i * step);
    return all;
}

template <class T>
std::vector<T> operator+(std::vector<T> a, const std::vector<T>& b) {
    a.insert(a.end(), b.begin(), b.end());
    return a;
}

// Two sizes, two rates, two sample rates, and sound that ends before or after its picture.
class Joined : public JoinedTask {
  protected:
    void addBoth(const AnyDict& picture, const AnyDict& sound, std::optional<InOutPoints> points = {}) {
        add(AnyVector(source(1, picture, points), source(2, sound, points)), AnyVector(picture, sound));
    }
    AnyDict missing() { return entry(folder_.file("none.wav"), AnyDict()); }

    AnyDict a_ = film("a.yuv", 10, 10, f25, 16, 8), aSound_ = sound("a.wav", 19200, 1000, 48000);
    AnyDict b_ = film("b.yuv", 20, 100, f50, 64, 32), bSound_ = sound("b.wav", 26460, 2000, 44100);
    AnyDict short_ = sound("s.wav", 9600, 3000, 48000);
};

// From the file of a task to the bytes of its output.
TEST_F(Joined, SegmentsOfDifferentFormatsComeOutAsOne) {
    const AnyDict card = entry(
        "card.tg",
        AnyDict(
            "name", "testgen", "streams",
            AnyDict("vids", AnyVector(Any(AnyDict("framerate", f25, "width", 64, "height", 48, "frames", 5))),
                    "auds", AnyVector(Any(AnyDict("duration", 0.2))))));
    addBoth(a_, aSound_);
    addBoth(a_, missing());
    state_.setSegmentEnabled(1, false);
    addBoth(b_, bSound_);
    addBoth(card, card);
    addBoth(a_, short_);
    const std::string file = folder_.file("task.xml");
    ASSERT_EQ(XmlParser::storeDict(file.c_str(), state_, "TranscodeTask", "2.0"), 0);
    Open open;
    QvEncodePipe* pipe = nullptr;
    QvTaskFault fault;
    std::unique_ptr<QvTask> task(QvTaskFile::open(file.c_str(), open.decoders, &pipe, nullptr, &fault));
    ASSERT_TRUE(task) << fault.path << ": " << fault.reason;
    open.pipe.reset(pipe);
    std::string first;
    for (int pass = 0; pass < 2; ++pass) {  // a task runs as often as it is wanted
        std::string error;
        EXPECT_EQ(run(*task, &error), 0) << error;
        const std::vector<int> shown = levels(written(".raw"));
        ASSERT_EQ(shown.size(), 35u);
        EXPECT_EQ(std::vector<int>(shown.begin(), shown.begin() + 20), steps(10, 10) + steps(100, 10, 2));
        for (int i = 20; i < 25; ++i) EXPECT_EQ(shown[static_cast<std::size_t>(i)], -1) << "a test card";
        EXPECT_EQ(std::vector<int>(shown.begin() + 25, shown.end()), steps(10, 10));
        const std::vector<int> heard = samples(written(".wav").substr(80));
        ASSERT_EQ(heard.size(), 35u * 1920);
        for (std::size_t i = 0; i < 19200; ++i) ASSERT_EQ(heard[i], 1000) << i;
        for (std::size_t i = 19200 + 50; i < 38400; ++i) ASSERT_NEAR(heard[i], 2000, 1) << i;
        for (std::size_t i = 48000; i < 57600; ++i) ASSERT_EQ(heard[i], 3000) << i;
        for (std::size_t i = 57600; i < 67200; ++i) ASSERT_EQ(heard[i], 0) << i;
        if (pass == 0) first = written(".wav");
    }
    EXPECT_EQ(written(".wav"), first);
    task.reset();
}

// What is stored is the inputs of the segments, and it is the same after it was restored.
TEST_F(Joined, AJoinedTaskIsStoredWithItsSegments) {
    const AnyDict slow = film("a.yuv", 100, 1, f25, 16, 8),
                  fast = film("b.yuv", 100, 101, QvFramerate(50.0), 16, 8);
    const AnyDict first = sound("a.wav", 200000, 5, 44100), second = sound("b.wav", 100000, 9, 48000);
    addBoth(slow, first, cut(0.4, 0.8));
    addBoth(fast, second, cut(0.2, 0.6));
    addBoth(slow, first, cut(2, 2.2));
    const auto made = restore();
    ASSERT_TRUE(made->task) << made->error;
    AnyDict stored, again;
    made->task->store(stored);
    EXPECT_EQ(run(*made->task), 0);
    const std::string picture = written(".raw"), heard = written(".wav");
    EXPECT_EQ(stored.getVector("files").size(), 4);
    state_ = QvTaskState(stored);
    EXPECT_EQ(state_.nrSegments(), 3);
    const auto open = restore();
    ASSERT_TRUE(open->task) << open->error;
    open->task->store(again);
    EXPECT_EQ(again, stored);
    EXPECT_EQ(run(*open->task), 0);
    EXPECT_TRUE(written(".raw") == picture && written(".wav") == heard);
}

// Those outside of a cut go, the others are at the frames of the output.
TEST_F(Joined, ChaptersAndQualityLogsAreThoseOfTheWhole) {
    const AnyDict slow = film("a.yuv", 100, 1, f25, 16, 8),
                  fast = film("b.yuv", 100, 101, QvFramerate(50.0), 16, 8);
    const auto with = [&](const AnyDict& file, const InOutPoints& points, const AnyVector& chapters,
                          int logs) {
        Any made = source(1, file, points);
        ProcessParams params;
        params.update(made.asDict().getDict("process"));
        if (!chapters.empty()) params.setChapterPoints(chapters);
        if (logs > 0) params.set("qualityStats", AnyVector(Any(AnyDict("number", logs))));
        made.asDict().set("process", static_cast<const AnyDict&>(params));
        return made;
    };
    state_.set("encoder", output(0));
    add(AnyVector(with(slow, cut(0.4, 0.8), AnyVector(Any(3), Any(10), Any(19), Any(20)), 0)),
        AnyVector(slow));
    add(AnyVector(with(fast, cut(0.2, 0.6), AnyVector(), 1)), AnyVector(fast));
    add(AnyVector(with(fast, cut(1, 2), AnyVector(Any(50), Any(54)), 2)), AnyVector(fast));
    add(AnyVector(with(fast, cut(0, 1), AnyVector(), 1)), AnyVector(fast));
    const auto open = restore();
    ASSERT_TRUE(open->task) << open->error;
    const ProcessParams& params = open->task->getLinkForOutput(1, 0)->processParams();
    ASSERT_TRUE(params.chapterPoints());
    EXPECT_EQ(*params.chapterPoints(), AnyVector(Any(0), Any(9), Any(20), Any(22)));
    EXPECT_EQ(params.get("qualityStats"), Any(AnyVector(AnyDict("number", 1), AnyDict("number", 2))));
}

// A frame of 1001/30000 s has 1471.47 samples of 44100 a second: no seam rounds for the next one.
TEST_F(Joined, SeamsDoNotAddUpTheirRounding) {
    const QvFramerate ntsc = QvFramerate::f29p();
    state_.set("encoder", output(1, ntsc, 44100));
    constexpr int frames = 200, period = 30011;
    const auto sampleOf = [](int frame) { return static_cast<int>(44100LL * 1001 * frame / 30000); };
    const AnyDict ramp = film("r.yuv", frames, 1, ntsc, 16, 8);
    std::string counted;
    for (int i = 0; i <= sampleOf(frames); ++i) counted += leBytes(static_cast<std::uint64_t>(i % period), 2);
    const AnyDict count = entry(folder_.write("c.wav", riff(wavChunk("fmt ", wavFormat(1, 1, 44100, 16)) +
                                                            wavChunk("data", counted))),
                                AnyDict());
    std::mt19937 random(9);
    std::vector<int> pictures, heard;
    for (int i = 0; i < 40; ++i) {
        const int from = static_cast<int>(random() % (frames - 7)),
                  length = 1 + static_cast<int>(random() % 7);
        const auto at = [&](int frame) { return MediaTime(frame, ntsc, MediaTime::defaultTimescale); };
        addBoth(ramp, count, InOutPoints(at(from), at(from + length)));
        const int before = sampleOf(static_cast<int>(pictures.size()));
        for (int k = 0; k < length; ++k) pictures.push_back(from + k + 1);
        const int samples = sampleOf(static_cast<int>(pictures.size())) - before;
        for (int k = 0; k < samples; ++k) heard.push_back((sampleOf(from) + k) % period);
    }
    const auto open = restore();
    ASSERT_TRUE(open->task) << open->error;
    EXPECT_EQ(run(*open->task), 0);
    EXPECT_EQ(levels(written(".raw")), pictures);
    const std::vector<int> got = samples(written(".wav").substr(80));
    ASSERT_EQ(got.size(), heard.size());
    for (std::size_t i = 0; i < heard.size(); ++i) ASSERT_EQ(got[i], heard[i]) << i;
}

// Without a map both channels are mixed.
TEST_F(Joined, TheChannelMapOfASourceHolds) {
    std::string both;
    for (int i = 0; i < 19200; ++i) both += leBytes(100, 2) + leBytes(200, 2);
    const AnyDict stereo = entry(
        folder_.write("two.wav", riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) + wavChunk("data", both))),
        AnyDict());
    const struct {
        AnyVector map;
        int heard;
        const char* line;
    } rows[] = {
        {AnyVector(), 150, ""},
        {AnyVector(Any(AnyDict("channel", 1))), 200, ""},
        // As in a link, a map that can't be used gives way to the default.
        {AnyVector(Any(AnyDict("channel", 9))), 150, "input channel (9)>= nr of input cannels(2)"},
        {AnyVector(Any(AnyDict("channel", 0, "stream", 1))), 150, "input stream number (1)"},
        {AnyVector(Any(AnyDict("channel", 0)), Any(AnyDict("channel", 1))), 150, "it has 2 out channels"},
    };
    std::vector<int> expected;
    for (const auto& row : rows) {
        addBoth(a_, stereo);
        AnyVector& sources = state_.get("streams").asVector().at(1).asDict().get("sources").asVector();
        if (!row.map.empty())
            sources.at(sources.size() - 1).asDict().set("process", AnyDict("audioChannelMap", row.map));
        expected = expected + std::vector<int>(19200, row.heard);
    }
    LogCapture log;
    const auto open = restore();
    ASSERT_TRUE(open->task) << open->error;
    for (const auto& row : rows) EXPECT_TRUE(log.contains(row.line)) << row.line;
    EXPECT_EQ(run(*open->task), 0);
    EXPECT_TRUE(samples(written(".wav").substr(80)) == expected);

    // A link would mix the two streams.
    const AnyDict length("duration", 0.4),
        two = entry("two.tg", AnyDict("name", "testgen", "streams",
                                      AnyDict("auds", AnyVector(Any(length), Any(length)))));
    addBoth(a_, two);
    AnyVector& sources = state_.get("streams").asVector().at(1).asDict().get("sources").asVector();
    sources.at(sources.size() - 1)
        .asDict()
        .set("process", AnyDict("audioChannelMap", AnyVector(Any(AnyDict("channel", 0, "stream", 1)))));
    EXPECT_EQ(failureOf([&] { restore(); }), "A joined segment can't mix several streams of its file");
}

TEST_F(Joined, SegmentsThatCanNotBeOpenedAreLeftOutUnlessTheyMustNot) {
    const AnyDict junk = entry(folder_.write("junk.wav", "no sound"), AnyDict());
    addBoth(a_, missing());
    addBoth(a_, aSound_);
    addBoth(b_, junk);
    addBoth(b_, bSound_);
    state_.setSegmentEnabled(3, false);
    const auto statuses = [](const QvBatchTask& task) {
        std::string all;
        for (int i = 0; i < task.nrSegments(); ++i) all += std::to_string(task.segment(i).status) + " ";
        return all;
    };
    {
        LogCapture log;
        const auto open = restore();
        ASSERT_TRUE(open->task);
        EXPECT_EQ(statuses(*open->task), "-1 0 -1 0 ");
        EXPECT_TRUE(open->task->usesBatchDecoder());
        EXPECT_EQ(open->task->indexOfActualSegment(1), 3);
        EXPECT_TRUE(log.contains("[Task] Cannot add input segment 2"));
        EXPECT_TRUE(log.contains("[Task] * Failed to open required input file(s) for 2 input segment(s)."));
    }
    {
        LogCapture log;
        const auto open = restore(QvBatchTask::skipDisabled);
        ASSERT_TRUE(open->task);
        EXPECT_EQ(statuses(*open->task), "-1 0 -1 1 ");
        EXPECT_FALSE(open->task->usesBatchDecoder());
        EXPECT_EQ(open->task->indexOfActualSegment(0), 1);
        EXPECT_EQ(open->task->indexOfActualSegment(1), -1);
        EXPECT_FALSE(log.contains("b.wav"));
        EXPECT_TRUE(log.contains("[Task] + Skipped because disabled"));
        EXPECT_EQ(run(*open->task), 0);
        EXPECT_EQ(levels(written(".raw")), steps(10, 10));
    }
    const auto strict = restore(QvBatchTask::everySegmentOpens);
    EXPECT_FALSE(strict->task || strict->pipe || !strict->decoders.empty());
    EXPECT_NE(strict->error.find("none.wav' in input segment 0"), std::string::npos) << strict->error;
    state_.setSegmentEnabled(1, false);
    QvBatchTask task;
    QvDPipeList decoders;
    QvEncodePipe* pipe = nullptr;
    EXPECT_EQ(task.restore(state_, decoders, &pipe, QvBatchTask::skipDisabled), QvStatus::noSegment);
    EXPECT_TRUE(!pipe && decoders.empty() && task.nrLinks() == 0 && !task.encoder());
    EXPECT_EQ(task.errorCode(), QvStatus::noSegment);
    EXPECT_NE(std::string(task.errorDesc()).find("junk.wav' in input segment 2"), std::string::npos);
}

TEST_F(Joined, AStreamThatTheFileLacksFailsItsSegment) {
    add(AnyVector(source(1, a_), source(2, aSound_, {}, 3)), AnyVector(a_, aSound_));
    addBoth(b_, bSound_);
    const auto open = restore();
    ASSERT_TRUE(open->task);
    EXPECT_EQ(open->task->segment(0).status, QvInputSegment::failed);
    EXPECT_FALSE(open->task->usesBatchDecoder());
}

TEST_F(Joined, AFileThatIsNotListedIsOpenedWithTheDefaultsOfItsKind) {
    add(AnyVector(source(1, a_), source(2, aSound_)), AnyVector(Any(a_)));
    addBoth(b_, bSound_);
    LogCapture log;
    const auto open = restore(QvBatchTask::everySegmentOpens);
    ASSERT_TRUE(open->task) << open->error;
    EXPECT_TRUE(log.contains("File open data not found in input files section. Using default open for"));
    EXPECT_EQ(run(*open->task), 0);
    EXPECT_EQ(levels(written(".raw")).size(), 20u);
}

// One decoder reads a file, unless a stream of it is used twice; a slot that nothing feeds stays empty.
TEST_F(Joined, DecodersAreSharedWithinASegment) {
    state_.set("encoder", output(3));
    const auto streams = [&](const AnyDict& picture, const AnyDict& sound) {
        return AnyVector(source(1, picture), source(2, sound), source(2, sound), source(2, aSound_));
    };
    add(streams(a_, aSound_), AnyVector(a_, aSound_));
    add(streams(b_, bSound_), AnyVector(b_, bSound_));
    state_.get("streams").asVector().at(3).asDict().set("sources", AnyVector());
    state_.remove("#nsegs");
    const auto open = restore();
    ASSERT_TRUE(open->task) << open->error;
    EXPECT_EQ(open->task->nrSegments(), 2);
    EXPECT_EQ(open->task->segment(0).decoders.size(), 3);
    EXPECT_EQ(open->decoders.size(), 6);
    EXPECT_EQ(open->task->segment(1).streams.size(), 4u);
    EXPECT_EQ(open->task->nrLinks(), 3);
    EXPECT_EQ(run(*open->task), 0);
    EXPECT_EQ(levels(written(".raw")).size(), 20u);
    state_.removeSegment(1);
    const auto single = restore();
    ASSERT_TRUE(single->task);
    EXPECT_EQ(single->task->nrLinks(), 3);
}

TEST_F(Joined, TheStreamsOfASegmentEndTogether) {
    addBoth(a_, bSound_);  // sound of another file, too long
    addBoth(a_, short_);
    const auto open = restore();
    ASSERT_TRUE(open->task);
    EXPECT_EQ(open->task->segment(0).streams[1]->effectiveDuration(), MediaTime(0.4));
    EXPECT_EQ(open->task->segment(1).streams[1]->effectiveDuration(), MediaTime(0.2));
    EXPECT_EQ(open->task->checkDurations(), 0);
    EXPECT_EQ(open->task->segment(0).streams[1]->effectiveDuration(), MediaTime(0.4));
}

TEST_F(Joined, AStateThatIsNoTaskIsRefused) {
    addBoth(a_, aSound_);
    addBoth(b_, bSound_);
    const QvTaskState sound = state_;
    const auto refusal = [&] {
        std::string error, text = failureOf([&] {
                               const auto open = restore();
                               EXPECT_FALSE(open->task);
                               error = open->error;
                           });
        if (!error.empty()) text = error;
        state_ = sound;
        return text;
    };
    state_.remove("streams");
    EXPECT_EQ(refusal(), "QvBatchTask::initFromState - invalid task struct, no output streams defined.");
    state_.get("encoder").asDict().set("streams", AnyVector());
    EXPECT_EQ(refusal(), "QvBatchTask::initFromState - invalid task struct, no output streams defined.");
    state_.remove("encoder");
    EXPECT_EQ(refusal(), "Invalid task structure - missing encoder settings");
    state_.get("streams").asVector().at(0).asDict().get("sources").asVector().remove(0);
    state_.remove("#nsegs");
    EXPECT_EQ(refusal(),
              "[Task] BatchTask.initFromState: No input segments defined, invalid task structure.");
    state_.get("encoder").asDict().set("profile", 4);
    EXPECT_EQ(refusal(), "Cannot restore - base profile 4 () not available.");
    state_.get("encoder").asDict().get("streams").asVector().at(0).asDict().set("type", 2);
    EXPECT_NE(refusal(), "no failure");
    QvBatchTask task;
    EXPECT_NE(failureOf([&] { task.segment(0); }), "no failure");
}

TEST_F(Joined, TheCommandAfterwardsGetsTheFilesOfAllSegments) {
    for (const AnyDict& picture : {a_, b_, a_}) addBoth(picture, aSound_);
    state_.setSegmentEnabled(1, false);
    state_.setPostprocessCommand("cat %i2 %i");
    const auto quoted = [](const AnyDict& file) {
        return "'" + std::string(file.get("filename").asString()) + "'";
    };
    const std::string a = quoted(a_), b = quoted(b_), sound = quoted(aSound_);
    std::string enabled = "cat";
    for (const std::string& name : {sound, a, sound}) enabled.append(" ").append(name);
    std::string everything = enabled;
    everything.append(" ").append(b);
    for (const bool all : {true, false}) {
        const auto open = restore(all ? 0 : QvBatchTask::skipDisabled);
        ASSERT_TRUE(open->task) << open->error;
        EXPECT_EQ(open->task->currentPostprocessCommand().asString(), all ? everything : enabled);
    }
    state_.swapSegments(0, 1);
    state_.removeSegment(2);
    const auto single = restore(QvBatchTask::skipDisabled);
    ASSERT_TRUE(single->task);
    EXPECT_STREQ(single->task->currentPostprocessCommand().asString(),
                 ("cat " + sound + " " + a + " " + sound).c_str());
}

// Files are open only while their segment is read.
TEST_F(Joined, ManySegmentsNeedFewOpenFiles) {
    for (int i = 0; i < 150; ++i) addBoth(i % 2 == 0 ? a_ : b_, i % 3 == 0 ? aSound_ : bSound_);
    const auto openFiles = [] {
        int count = 0;
        for ([[maybe_unused]] const auto& one : std::filesystem::directory_iterator("/proc/self/fd")) ++count;
        return count;
    };
    struct Watching : QvTranscoder {
        using QvTranscoder::QvTranscoder;
        ~Watching() override { stop(); }
        int cbProcess() override {
            most = std::max(most, look());
            return 0;
        }
        std::function<int()> look;
        int most = 0;
    };
    const int before = openFiles();
    const auto open = restore(QvBatchTask::everySegmentOpens);
    ASSERT_TRUE(open->task) << open->error;
    EXPECT_LE(openFiles(), before + 8);
    Watching transcoder(open->task.get());
    transcoder.look = openFiles;
    transcoder.setParam("startDelay", 0);
    EXPECT_EQ(transcoder.transcode(true), 0) << transcoder.errorDesc();
    EXPECT_LE(transcoder.most, before + 24);
    EXPECT_EQ(levels(written(".raw")).size(), 1500u);
}

}  // namespace
