#include <numeric>

#include "builtin/modules.h"
#include "core/filter/qvprocesspipe.h"
#include "core/transcode/link/video/transvlink.h"
#include "tests/support/checks.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"

namespace {

const QvFramerate f25 = QvFramerate::f25p(), f29 = QvFramerate::f29p(), f50 = QvFramerate::f50p();

AnyVector pointsOf(const MediaTime& in, const MediaTime& out) { return AnyVector(Any(in), Any(out)); }

MediaTime frameTime(int frame, const QvFramerate& rate) {
    return MediaTime(frame, rate, MediaTime::defaultTimescale);
}

std::vector<int> range(int from, int to) {
    std::vector<int> numbers(static_cast<size_t>(to - from));
    std::iota(numbers.begin(), numbers.end(), from);
    return numbers;
}

Any fourccs(std::initializer_list<unsigned> list) {
    AnyVector vector;
    for (const auto fourcc : list) vector.append(Any(static_cast<int>(fourcc)));
    return vector;
}

AnyDict customFilters(const AnyVector& filters) { return AnyDict("customFilters", filters); }

// Decoder, link and encoder; the driver's part is done by run().
struct Job {
    explicit Job(int frames, const QvFramerate& in = f25, const QvFramerate& out = f25)
        : decoder(frames, in), encoder(out) {
        plugin.video("frconvert")
            .video("scaler")
            .video("videofade")
            .video("bobber")
            .video("logo")
            .add(new QvVfModule);
    }
    int open() {
        if (const int result = link.init(&decoder, 0, &encoder, 0)) return result;
        const int result = link.open(params.empty() ? nullptr : &params);
        if (result == 0) decoder.seek(link.inPoint(), 1, 0);
        return result;
    }
    int run(int limit = 1000) {
        int result = 0;
        while (!link.finished() && result == 0 && limit-- > 0) result = link.processFrame(0);
        EXPECT_GE(limit, 0) << "the link does not end";
        return result;
    }
    FakeVideoFilter* filter(const char* name, int index = 0) {
        return static_cast<FakeVideoFilter*>(link.filter(name, index));
    }

    FakePlugin plugin;
    FakeDecoder decoder;
    FakeEncodePipe encoder;
    TransVLink link;
    AnyDict params;
};

TEST(TransVLink, HandsTheDecodersOwnFramesToTheEncoderAndRunsAgain) {
    Job job(5);
    for (size_t run = 1; run <= 2; ++run) {
        ASSERT_EQ(job.open(), 0);
        EXPECT_EQ(job.run(), 0);
        EXPECT_EQ(job.encoder.video.numbers.size(), 5 * run);
        for (const auto* frame : job.encoder.video.addresses) EXPECT_EQ(frame, &job.decoder.frame);
        EXPECT_EQ(job.link.outProcessed(), 5);
        EXPECT_DOUBLE_EQ(job.link.completed(), 100.0);
        EXPECT_EQ(job.link.close(), 0);
        EXPECT_EQ(job.link.outProcessed(), -1);
    }
}

TEST(TransVLink, PointsChooseTheFrames) {
    const struct {
        MediaTime in, out;
        int first, count;
    } rows[] = {
        {frameTime(3, f29), frameTime(7, f29), 3, 4},  {MediaTime(), frameTime(1, f29), 0, 1},
        {frameTime(6, f29), MediaTime(), 6, 4},         // an out point not given
        {MediaTime(0.1), MediaTime(0.2), 2, 3},         // instants within frames 2 and 5
        {frameTime(8, f29), frameTime(50, f29), 8, 2},  // beyond the end
    };
    for (const auto& row : rows) {
        Job job(10, f29, f29);
        job.params.set("inOutPoints", pointsOf(row.in, row.out));
        ASSERT_EQ(job.open(), 0);
        EXPECT_EQ(job.run(), 0);
        EXPECT_EQ(job.encoder.video.numbers, range(row.first, row.first + row.count)) << row.first;
    }
    // The end of the stream lies between two ticks.
    const QvFramerate odd(QvRatio(151, 20));
    Job whole(20, odd, odd);
    ASSERT_EQ(whole.open(), 0);
    EXPECT_EQ(whole.run(), 0);
    EXPECT_EQ(whole.encoder.video.numbers, range(0, 20));
}

TEST(TransVLink, FailuresComeOut) {
    const auto logo = [](const char* refusal) {
        return customFilters(AnyVector(Any(AnyDict("name", "logo", "_on", 1, refusal, -3))));
    };
    const struct {
        std::function<void(Job&)> arrange;
        int open, run;
        const char* text;
    } rows[] = {
        {[](Job& j) { j.params.set("inOutPoints", pointsOf(MediaTime(0.2), MediaTime(0.1))); }, -1, 0,
         "The out point is not after the in point"},
        {[](Job& j) { j.decoder.video.set("framerate", Any(QvFramerate(QvRatio(25, 0)))); }, -1, 0, ""},
        {[](Job& j) {
             qv_registry()->cleanup();
             j.encoder.video.params.set("framerate", f50);
         },
         -1, 0, "filter module 'frconvert' is not available"},
        {[&](Job& j) { j.params.set("effects", logo("refuseOpen")); }, -1, 0, "logo"},
        {[&](Job& j) { j.params.set("effects", logo("refuseClose")); }, 0, 0, "logo: it failed"},
        {[](Job& j) { j.decoder.failAt = 3; }, 0, -1, "the disc is gone"},
        {[](Job& j) { j.encoder.video.result = -7; }, 0, -7, ""},
    };
    for (const auto& row : rows) {
        SCOPED_TRACE(&row - rows);
        Job job(10);
        row.arrange(job);
        ASSERT_EQ(job.open(), row.open);
        if (row.open == 0) {
            EXPECT_EQ(job.run(), row.run);
            EXPECT_EQ(job.link.close(), row.run == 0 ? -3 : 0) << "what nothing reported before";
        }
        EXPECT_NE(std::string(job.link.errorDesc()).find(row.text), std::string::npos);
        EXPECT_NE(job.link.errorCode(), 0);
    }
}

// The input may have no end.
TEST(TransVLink, AFilterThatTakesNoFrameEndsTheJob) {
    Job job(1000);
    job.params.set("inOutPoints", pointsOf(MediaTime(0.0), MediaTime(0.4)));
    job.params.set("effects",
                   customFilters(AnyVector(Any(AnyDict("name", "logo", "_on", 1, "refuseWrite", -7)))));
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), -7);
    EXPECT_EQ(job.decoder.read, 10);
    EXPECT_TRUE(job.encoder.video.numbers.empty());
}

TEST(TransVLink, HoldsTheLastFrameUpToThePointWhereItIsAsked) {
    for (const bool pipe : {false, true}) {
        Job job(10);
        if (pipe)
            job.params.set("effects", customFilters(AnyVector(Any(AnyDict("name", "videofade", "_on", 1)))));
        job.params.set("inOutPoints", pointsOf(frameTime(7, f25), frameTime(15, f25)));
        job.params.set("holdLast", 1);
        ASSERT_EQ(job.open(), 0);
        EXPECT_EQ(job.run(), 0);
        EXPECT_EQ(job.encoder.video.numbers, range(7, 15)) << "frames have the numbers of their places";
        EXPECT_EQ(job.link.outProcessed(), 8);
    }
}

TEST(TransVLink, TruncatedInputEndsWithoutError) {
    Job job(10);
    job.decoder.truncatedAt = 4;
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.numbers, range(0, 4));
    EXPECT_EQ(job.link.outProcessed(), 5);  // the step that found the end counts
}

TEST(TransVLink, RepeatsTheLastFrameForAnEvenCount) {
    for (const int frames : {4, 5})
        for (const int width : {16, 32}) {  // straight, and through a pipe
            Job job(frames);
            job.encoder.video.params.set("width", width);
            job.encoder.video.params.set("_needEven", 1);
            ASSERT_EQ(job.open(), 0);
            EXPECT_EQ(job.run(), 0);
            auto expected = range(0, frames);
            if (frames % 2) expected.push_back(frames - 1);
            EXPECT_EQ(job.encoder.video.numbers, expected);
            EXPECT_EQ(job.encoder.video.params.isSet("_repeatingLast"), frames % 2 != 0);
        }
}

// The source has more frames than are taken, or one too few: then its last frame is taken twice.
TEST(TransVLink, HalvedRateTakesAnEvenNumberOfFramesAndMovesTheChapters) {
    for (const int frames : {20, 11}) {
        Job job(frames, f50, f25);
        job.params.set("inOutPoints", pointsOf(MediaTime(), frameTime(11, f50)));
        job.params.set("chapters", AnyVector(0, 4, 9));
        ASSERT_EQ(job.open(), 0);
        EXPECT_EQ(job.link.nrFramesIn(), 12);
        EXPECT_EQ(job.link.totalOutFrames(), 6);
        EXPECT_EQ(job.encoder.video.params.get("chapters").asVector(), AnyVector(0, 2, 4));
        std::vector<int> seen;
        job.filter("frconvert")->copies = [&](int nr) { return seen.push_back(nr), nr % 2; };
        EXPECT_EQ(job.run(), 0);
        EXPECT_EQ(seen, range(0, 12));
        EXPECT_EQ(job.encoder.video.numbers, (std::vector<int>{1, 3, 5, 7, 9, 11}));
    }
}

TEST(TransVLink, FiltersHearHowManyFramesTheyWillSee) {
    Job job(50, f25, f50);
    job.encoder.video.params.set("width", 32);
    const auto at = [](const char* name, int front, int position) {
        return Any(AnyDict("name", name, "_on", 1, "_front", front, "_position", position));
    };
    const Any early = at("videofade", 1, 2), late = at("videofade", 0, 1);
    job.params.set("effects", customFilters(AnyVector(early, late)));
    ASSERT_EQ(job.open(), 0);
    const auto total = [&](const char* name, int index) {
        return job.filter(name, index)->seen.getInt32("_totalFrames", -1);
    };
    EXPECT_EQ(total("videofade", 0), 50);
    EXPECT_EQ(total("scaler", 0), 50);
    EXPECT_EQ(total("frconvert", 0), -1);
    EXPECT_EQ(total("videofade", 1), 100);
    // A bobber makes two frames of one, before them or after.
    job.link.close();
    job.params.set("effects", customFilters(AnyVector(at("bobber", 1, 1), early, late, at("bobber", 0, 2))));
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(total("videofade", 0), 100);
    EXPECT_EQ(total("videofade", 1), 50);
}

TEST(TransVLink, ChoosesAFormatThatTheEncoderTakes) {
    const struct {
        unsigned in;
        Any list;
        unsigned chosen;  // 0: no conversion
    } rows[] = {
        {QvFourcc::I420, fourccs({QvFourcc::BGR4, QvFourcc::YUY2}), QvFourcc::BGR4},
        {QvFourcc::W016, fourccs({QvFourcc::BGR4, QvFourcc::YUY2}), QvFourcc::Y216},
        {QvFourcc::W016, fourccs({QvFourcc::Y216, QvFourcc::YUY2}), QvFourcc::Y216},
        {QvFourcc::GRAY, fourccs({QvFourcc::BGR4, QvFourcc::GRAY}), 0},
    };
    for (const auto& row : rows) {
        Job job(5);
        job.decoder.video.set("FOURCC", static_cast<int>(row.in));
        job.encoder.video.params.set("inFOURCC", row.list);
        ASSERT_EQ(job.open(), 0);
        const auto* scaler = job.filter("scaler");
        ASSERT_EQ(scaler != nullptr, row.chosen != 0);
        if (scaler) {
            EXPECT_EQ(scaler->getParam("FOURCC"), Any(static_cast<int>(row.chosen)));
        }
    }
}

struct SmartJob : Job {
    SmartJob() : Job(6) {
        decoder.extra.set("srParams", AnyDict("gop", 12));
        encoder.video.params.set("srPossible", 1);
        params.set("smartRender", 1);
    }
    bool isSmart() const { return encoder.video.params.getInt32("smartRender", -1) == 1; }
};

TEST(TransVLink, SmartRenderingSendsNoFrames) {
    SmartJob job;
    job.params.set("inOutPoints", pointsOf(frameTime(1, f25), frameTime(4, f25)));
    ASSERT_EQ(job.open(), 0);
    ASSERT_TRUE(job.isSmart());
    const AnyDict& coded = job.encoder.video.params.get("decoderStruct").asDict();
    EXPECT_EQ(coded.getInt32("frame0"), 1);
    EXPECT_EQ(coded.getInt32("nrFrames"), 3);
    EXPECT_TRUE(job.decoder.set.get("smartRenderingOn") == Any(Pair(1, 0)));
    job.encoder.video.params.set("smartRenderingOn", 1);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.addresses, std::vector<QvFrame*>(3, nullptr));
    EXPECT_EQ(job.decoder.read, 0);
}

// Encoders may pass some frames and encode others; one that knows nothing of it is asked in the first step.
TEST(TransVLink, EachFrameIsPassedOrEncodedAsTheEncoderSays) {
    SmartJob job;
    ASSERT_EQ(job.open(), 0);
    for (const int on : {0, 1, 0}) {
        job.encoder.video.params.set("smartRenderingOn", on);
        EXPECT_EQ(job.link.processFrame(0), 0);
        EXPECT_EQ(job.encoder.video.addresses.back() == nullptr, on == 1);
    }
    for (const bool knows : {true, false}) {
        Job plain(6);
        ASSERT_EQ(plain.open(), 0);
        if (knows) plain.encoder.video.params.set("smartRender", 1);
        EXPECT_EQ(plain.link.processFrame(0), 0);
        plain.encoder.video.params.set("smartRenderingOn", 1);
        EXPECT_EQ(plain.link.processFrame(0), 0);
        EXPECT_EQ(plain.encoder.video.addresses.back() == nullptr, knows);
        plain.link.close();
        ASSERT_EQ(plain.open(), 0);
        EXPECT_EQ(plain.link.processFrame(0), 0);
        EXPECT_EQ(plain.encoder.video.addresses.back(), nullptr) << "the next run asks again";
    }
}

TEST(TransVLink, WhatBarsSmartRendering) {
    const struct {
        const char* what;
        void (*arrange)(SmartJob&);
        bool smart;
    } rows[] = {
        {"chapters", [](SmartJob& j) { j.params.set("chapters", AnyVector(Any(2))); }, false},
        {"ignorant encoder", [](SmartJob& j) { j.encoder.video.params.remove("srPossible"); }, false},
        {"ignorant decoder", [](SmartJob& j) { j.decoder.extra.clear(); }, false},
        {"scaler", [](SmartJob& j) { j.encoder.video.params.set("width", 32); }, false},
        {"blanking lines alone",
         [](SmartJob& j) {
             j.encoder.video.params.set("_needTopBlanking", 4);
             j.encoder.video.params.set("height", 12);
         },
         true},
    };
    for (const auto& row : rows) {
        SmartJob job;
        row.arrange(job);
        ASSERT_EQ(job.open(), 0);
        EXPECT_EQ(job.isSmart(), row.smart) << row.what;
    }
}

}  // namespace
