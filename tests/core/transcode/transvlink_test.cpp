#include <gtest/gtest.h>

#include <memory>

#include "builtin/modules.h"
#include "core/engine/qvexception.h"
#include "core/filter/qvprocesspipe.h"
#include "core/stream/qvbuffifo.h"
#include "core/transcode/translink.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"
#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

namespace {

using ::testing::Test;

AnyDict pointsOf(const MediaTime& in, const MediaTime& out) {
    return AnyDict("inOutPoints", AnyVector(Any(in), Any(out)));
}

MediaTime frameTime(int frame, const QvFramerate& rate) {
    return MediaTime(frame, rate, MediaTime::defaultTimescale);
}

std::vector<int> range(int from, int to) {
    std::vector<int> numbers;
    for (int i = from; i < to; ++i) numbers.push_back(i);
    return numbers;
}

// Decoder, link and encoder; the driver's part is done by run().
struct Job {
    Job(int frames, const QvFramerate& in, const QvFramerate& out) : decoder(frames, in), encoder(out) {}

    int open(const AnyDict* params = nullptr) {
        if (const int result = link.init(&decoder, 0, &encoder, 0)) return result;
        const int result = link.open(params);
        if (result == 0) decoder.seek(link.inPoint(), 1, 0);
        return result;
    }
    int run(int limit = 1000) {
        int result = 0;
        while (!link.finished() && result == 0 && limit-- > 0) result = link.processFrame(0);
        EXPECT_GE(limit, 0) << "the link does not end";
        return result;
    }

    FakeDecoder decoder;
    FakeEncodePipe encoder;
    TransVLink link;
};

TEST(TransVLink, HandsTheDecodersOwnFramesToTheEncoder) {
    Job job(5, QvFramerate::f25p(), QvFramerate::f25p());
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.numbers, range(0, 5));
    for (const auto* frame : job.encoder.video.addresses) EXPECT_EQ(frame, &job.decoder.frame);
    EXPECT_EQ(job.link.outProcessed(), 5);
    EXPECT_DOUBLE_EQ(job.link.completed(), 100.0);
    EXPECT_EQ(job.decoder.read, 5);

    // The same link runs again, as in a second pass.
    EXPECT_EQ(job.link.close(), 0);
    EXPECT_EQ(job.link.outProcessed(), -1);
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.numbers.size(), 10u);
}

TEST(TransVLink, PointsChooseTheFrames) {
    const auto rate = QvFramerate::f29p();
    struct Row {
        MediaTime in, out;
        int first, count;
    };
    const Row rows[] = {
        {frameTime(3, rate), frameTime(7, rate), 3, 4},  {MediaTime(), frameTime(1, rate), 0, 1},
        {frameTime(6, rate), MediaTime(), 6, 4},          // an out point not given
        {MediaTime(0.1), MediaTime(0.2), 2, 3},           // instants within frames 2 and 5
        {frameTime(8, rate), frameTime(50, rate), 8, 2},  // beyond the end
    };
    for (const auto& row : rows) {
        Job job(10, rate, rate);
        const AnyDict params = pointsOf(row.in, row.out);
        ASSERT_EQ(job.open(&params), 0);
        EXPECT_EQ(job.run(), 0);
        EXPECT_EQ(job.encoder.video.numbers, range(row.first, row.first + row.count)) << row.first;
    }
}

TEST(TransVLink, RefusesPointsThatLieTheWrongWayRound) {
    Job job(10, QvFramerate::f25p(), QvFramerate::f25p());
    const AnyDict params = pointsOf(MediaTime(0.2), MediaTime(0.1));
    EXPECT_EQ(job.open(&params), -1);
    EXPECT_STREQ(job.link.errorDesc(), "The out point does not lie behind the in point");
}

TEST(TransVLink, MisuseIsRefused) {
    Job job(10, QvFramerate::f25p(), QvFramerate::f25p());
    EXPECT_EQ(job.link.init(&job.decoder, 0, &job.encoder, 1), -1);
    EXPECT_THROW(job.link.init(&job.decoder, 0, &job.encoder, -1), QvAssertFailure);
    const AnyDict old("startFrame", 1);
    EXPECT_THROW(job.open(&old), QvAssertFailure);
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.link.open(nullptr), -1);
    job.decoder.isOn = false;
    EXPECT_THROW(job.link.init(&job.decoder, 0, &job.encoder, 0), QvAssertFailure);
}

TEST(TransVLink, ASourceWithoutRateIsRefused) {
    for (const auto& rate : {Any(), Any(QvFramerate(QvRatio(0, 1))), Any(QvFramerate(QvRatio(25, 0)))}) {
        Job job(10, QvFramerate::f25p(), QvFramerate::f25p());
        job.decoder.video.set("framerate", rate);
        EXPECT_EQ(job.open(), -1);
    }
}

TEST(TransVLink, SaysWhichConverterIsMissing) {
    Job video(10, QvFramerate::f25p(), QvFramerate::f50p());
    EXPECT_EQ(video.open(), -1);
    EXPECT_STREQ(video.link.errorDesc(), "filter module 'frconvert' is not available");
}

TEST(TransVLink, AFilterThatDoesNotOpenIsAnErrorOfTheLink) {
    FakePlugin plugin;
    plugin.video("logo").add(new QvVfModule);
    const AnyDict logo("name", "logo", "_on", 1, "refuseOpen", -3);
    const AnyDict params("effects", AnyDict("customFilters", AnyVector(Any(logo))));
    Job job(10, QvFramerate::f25p(), QvFramerate::f25p());
    EXPECT_EQ(job.open(&params), -1);
    EXPECT_NE(std::string(job.link.errorDesc()).find("logo"), std::string::npos);
}

TEST(TransVLink, TruncatedInputEndsWithoutError) {
    LogCapture log;
    Job job(10, QvFramerate::f25p(), QvFramerate::f25p());
    job.decoder.truncatedAt = 4;
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.numbers, range(0, 4));
    EXPECT_EQ(job.link.outProcessed(), 5);  // the step that found the end counts
    EXPECT_TRUE(log.contains("frames out: 5 (10 expected), frames in: 10."));
}

TEST(TransVLink, ReadAndWriteErrorsComeOut) {
    Job reading(10, QvFramerate::f25p(), QvFramerate::f25p());
    reading.decoder.failAt = 3;
    ASSERT_EQ(reading.open(), 0);
    EXPECT_EQ(reading.run(), -1);
    EXPECT_STREQ(reading.link.errorDesc(), "the disc is gone");
    EXPECT_TRUE(reading.link.finished());

    Job writing(10, QvFramerate::f25p(), QvFramerate::f25p());
    writing.encoder.video.result = -7;
    ASSERT_EQ(writing.open(), 0);
    EXPECT_EQ(writing.run(), -7);
    EXPECT_EQ(writing.link.errorCode(), -7);
}

TEST(TransVLink, RepeatsTheLastFrameForAnEvenCount) {
    for (const int frames : {4, 5}) {
        Job job(frames, QvFramerate::f25p(), QvFramerate::f25p());
        job.encoder.video.params.set("_needEven", 1);
        ASSERT_EQ(job.open(), 0);
        EXPECT_EQ(job.run(), 0);
        auto expected = range(0, frames);
        if (frames % 2) expected.push_back(frames - 1);
        EXPECT_EQ(job.encoder.video.numbers, expected);
        EXPECT_EQ(job.link.outProcessed() % 2, 0);
        EXPECT_EQ(job.encoder.video.params.isSet("_repeatingLast"), frames % 2 != 0);
    }
}

TEST(TransVLink, ChaptersGoToTheEncoderAtItsRate) {
    FakePlugin plugin;
    plugin.video("frconvert").add(new QvVfModule);
    Job job(100, QvFramerate::f50p(), QvFramerate::f25p());
    const AnyDict params("chapters", AnyVector(0, 20, 51));
    ASSERT_EQ(job.open(&params), 0);
    EXPECT_EQ(job.encoder.video.params.get("chapters").asVector(), AnyVector(0, 10, 25));
}

TEST(TransVLink, HalvedRateTakesAnEvenNumberOfFrames) {
    FakePlugin plugin;
    plugin.video("frconvert").add(new QvVfModule);
    Job job(20, QvFramerate::f50p(), QvFramerate::f25p());
    const AnyDict params = pointsOf(MediaTime(), frameTime(11, QvFramerate::f50p()));
    ASSERT_EQ(job.open(&params), 0);
    EXPECT_EQ(job.link.nrFramesIn(), 12);
    EXPECT_EQ(job.link.totalOutFrames(), 6);
    static_cast<FakeVideoFilter*>(job.link.filter("frconvert", 0))->copies = [](int nr) {
        return nr % 2 ? 0 : 1;
    };
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.numbers, (std::vector<int>{0, 2, 4, 6, 8, 10}));
}

TEST(TransVLink, FiltersHearHowManyFramesTheyWillSee) {
    FakePlugin plugin;
    plugin.video("frconvert").video("scaler").video("videofade").add(new QvVfModule);
    Job job(50, QvFramerate::f25p(), QvFramerate::f50p());
    job.encoder.video.params.set("width", 32);
    AnyDict fade("name", "videofade", "_on", 1, "_front", 1);
    AnyDict late = fade;
    late.set("_front", 0);
    AnyDict effects("customFilters", AnyVector(Any(fade), Any(late)));
    const AnyDict params("effects", effects);
    ASSERT_EQ(job.open(&params), 0);
    const auto totalOf = [&](const char* name, int index) {
        return static_cast<FakeVideoFilter*>(job.link.filter(name, index))->seen.getInt32("_totalFrames", -1);
    };
    EXPECT_EQ(totalOf("videofade", 0), 50);
    EXPECT_EQ(totalOf("scaler", 0), 50);
    EXPECT_EQ(totalOf("frconvert", 0), -1);
    EXPECT_EQ(totalOf("videofade", 1), 100);
}

TEST(TransVLink, ChoosesAFormatThatTheEncoderTakes) {
    FakePlugin plugin;
    plugin.video("scaler").add(new QvVfModule);
    const auto fourccs = [](std::initializer_list<unsigned> list) {
        AnyVector vector;
        for (const auto fourcc : list) vector.append(Any(static_cast<int>(fourcc)));
        return vector;
    };
    struct Row {
        unsigned in;
        AnyVector list;
        unsigned chosen;
    };
    const Row rows[] = {
        {QvFourcc::I420, fourccs({QvFourcc::BGR4, QvFourcc::YUY2}), QvFourcc::BGR4},
        {QvFourcc::W016, fourccs({QvFourcc::BGR4, QvFourcc::YUY2}), QvFourcc::Y216},
        {QvFourcc::W016, fourccs({QvFourcc::Y216, QvFourcc::YUY2}), QvFourcc::Y216},
    };
    for (const auto& row : rows) {
        Job job(5, QvFramerate::f25p(), QvFramerate::f25p());
        job.decoder.video.set("FOURCC", static_cast<int>(row.in));
        job.encoder.video.params.set("inFOURCC", row.list);
        ASSERT_EQ(job.open(), 0);
        auto* scaler = job.link.filter("scaler", 0);
        ASSERT_TRUE(scaler);
        EXPECT_EQ(scaler->getParam("FOURCC"), Any(static_cast<int>(row.chosen)));
    }
    Job job(5, QvFramerate::f25p(), QvFramerate::f25p());
    job.encoder.video.params.set("inFOURCC", fourccs({QvFourcc::BGR4, QvFourcc::GRAY}));
    ASSERT_EQ(job.open(), 0);
    EXPECT_FALSE(job.link.filter("scaler", 0));
}

TEST(TransVLink, CaptionsComeFromTheMetaSource) {
    Job job(4, QvFramerate::f25p(), QvFramerate::f25p());
    FakeDecoder captions(4, QvFramerate::f25p());
    captions.captionEvery = 2;
    MetaProcessParams params;
    params.setCcMode(true, false, 1, false, false);
    ASSERT_EQ(job.link.addMetaSource(&captions, 4, 0, params), 0);
    EXPECT_EQ(job.link.metaSource(0), &captions);
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.captions, (std::vector<int>{0, -1, 2, -1}));
    EXPECT_EQ(job.encoder.video.params.get("ccMode").asDict().getInt32("do608"), 1);
}

TEST(TransVLink, TheLinksOwnStreamIsNotReadTwiceForItsCaptions) {
    Job job(4, QvFramerate::f25p(), QvFramerate::f25p());
    job.decoder.captionEvery = 1;
    job.link.addMetaSource(&job.decoder, 1, 0, {});
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.numbers, range(0, 4));
    EXPECT_EQ(job.encoder.video.captions, range(0, 4));
}

struct SmartJob : Job {
    SmartJob() : Job(6, QvFramerate::f25p(), QvFramerate::f25p()) {
        decoder.extra.set("srParams", AnyDict("gop", 12));
        encoder.video.params.set("srPossible", 1);
    }
    bool isSmart() const { return encoder.video.params.getInt32("smartRender", -1) == 1; }
};

TEST(TransVLink, SmartRenderingSendsNoFrames) {
    SmartJob job;
    AnyDict params = pointsOf(frameTime(1, QvFramerate::f25p()), frameTime(4, QvFramerate::f25p()));
    params.set("smartRender", 1);
    ASSERT_EQ(job.open(&params), 0);
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

TEST(TransVLink, SmartRenderingStaysOff) {
    const AnyDict wanted("smartRender", 1);
    {
        SmartJob job;
        const AnyDict params("smartRender", 1, "chapters", AnyVector(Any(2)));
        ASSERT_EQ(job.open(&params), 0);
        EXPECT_FALSE(job.isSmart()) << "with chapters";
    }
    {
        SmartJob job;
        job.encoder.video.params.remove("srPossible");
        ASSERT_EQ(job.open(&wanted), 0);
        EXPECT_FALSE(job.isSmart()) << "with an encoder that does not know of it";
    }
    {
        SmartJob job;
        job.decoder.extra.clear();
        ASSERT_EQ(job.open(&wanted), 0);
        EXPECT_FALSE(job.isSmart()) << "with a decoder that does not know of it";
    }
    FakePlugin plugin;
    plugin.video("scaler").add(new QvVfModule);
    {
        SmartJob job;
        job.encoder.video.params.set("width", 32);
        ASSERT_EQ(job.open(&wanted), 0);
        EXPECT_FALSE(job.isSmart()) << "through a scaler";
    }
    {
        SmartJob job;
        job.encoder.video.params.set("_needTopBlanking", 4);
        job.encoder.video.params.set("height", 12);
        ASSERT_EQ(job.open(&wanted), 0);
        EXPECT_TRUE(job.isSmart()) << "blanking lines alone do not bar it";
    }
}

TEST(TransVLink, QualityLogNeedsAnEncoderThatGivesIt) {
    LogCapture log;
    Job job(4, QvFramerate::f25p(), QvFramerate::f25p());
    job.encoder.video.refused.set("getQualityStats", 1);
    QvEncodingQualityStatsSetup setup;
    setup.addLog("q.txt");
    const AnyDict params("qualityStats", static_cast<const AnyVector&>(setup));
    ASSERT_EQ(job.open(&params), 0);
    EXPECT_TRUE(log.contains("does not support PSNR logging.", QvLogMask::error));
    job.link.close();

    job.encoder.video.refused.clear();
    ASSERT_EQ(job.open(&params), 0);
    EXPECT_TRUE(log.contains("Can not start logging.", QvLogMask::error));
    EXPECT_EQ(job.encoder.video.params.getInt32("getQualityStats", -1), 0);
}

// One video stream, for what the link asks of a multiplexer.
class OneStreamMuxer : public QvMuxer {
  public:
    explicit OneStreamMuxer(QvBufStream* video = nullptr) : video_(video) {}
    QvBufStream* addStream(int, const AnyDict&) override { return nullptr; }
    void removeStreams(int) override {}
    void removeStream(int, int) override {}
    int nrStreams(int type) const override { return type == 1 && video_ ? 1 : 0; }
    QvBufStream* stream(int, int) const override { return video_; }
    void getParam(const char* name, Any& value) const override {
        if (params.isSet(name)) value = params.get(name);
    }
    int open() override { return 0; }
    int close() override { return 0; }
    AnyDict params;

  private:
    QvBufStream* video_;
};

TEST(TransVLink, WritesWhatTheEncoderTellsOfItsFrames) {
    TempFolder folder;
    QvBufStreamFifo stream;
    const AnyDict size("size", 4096, "chunk", 1024);
    ASSERT_EQ(stream.init(size), 0);
    OneStreamMuxer muxer(&stream);
    Job job(3, QvFramerate::f25p(), QvFramerate::f25p());
    job.encoder.muxer = &muxer;
    QvEncodingQualityStatsSetup setup;
    setup.addLog(Any(folder.file("q.txt").c_str()));
    const AnyDict params("qualityStats", static_cast<const AnyVector&>(setup));
    ASSERT_EQ(job.open(&params), 0);
    const auto tell = [&](std::vector<double> values, unsigned bytes) {
        auto* bs = stream.input();
        bs->auxinfo(bs, 0, QvAuxId::STATISTIC_INFO, values.data(),
                    static_cast<unsigned>(values.size() * sizeof(double)));
        bs->auxinfo(bs, 0, QvAuxId::VIDEO_AU_CODE, &bytes, sizeof bytes);
    };
    tell({40.5, 41.0, 42.25}, 1000);
    tell({}, 20);
    job.link.close();
    EXPECT_EQ(TempFolder::read(folder.file("q.txt")), "0\t1000\t40.5000\t41.0000\t42.2500\n1\t20\n");
    EXPECT_EQ(job.encoder.video.params.getInt32("getQualityStats", -1), 0);
    tell({1.0}, 5);  // nobody listens any more
}

TEST(TransVLink, TheFirstFrameBecomesTheIcon) {
    TempFolder folder;
    FakePlugin plugin;
    plugin.video("scaler").add(new QvVfModule);
    OneStreamMuxer muxer;
    muxer.params.set("needBMP", 1);
    muxer.params.set("filename", Any(folder.file("clip.mov").c_str()));
    Job job(3, QvFramerate::f25p(), QvFramerate::f25p());
    job.decoder.video.set("FOURCC", static_cast<int>(QvFourcc::BGR3));
    job.encoder.video.params.set("inFOURCC", AnyVector(Any(static_cast<int>(QvFourcc::BGR3))));
    job.encoder.muxer = &muxer;
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(TempFolder::read(folder.file("clip.BMP")).substr(0, 2), "BM");
}

TEST(TransVLink, RepeatsAFrameOfThePipe) {
    FakePlugin plugin;
    plugin.video("scaler").add(new QvVfModule);
    Job job(3, QvFramerate::f25p(), QvFramerate::f25p());
    job.encoder.video.params.set("width", 32);
    job.encoder.video.params.set("_needEven", 1);
    ASSERT_EQ(job.open(), 0);
    EXPECT_EQ(job.run(), 0);
    EXPECT_EQ(job.encoder.video.numbers, (std::vector<int>{0, 1, 2, 2}));
}

TEST(TransVLink, TakesOnlyTheParametersThatAreThere) {
    TransVLink link;
    ProcessParams first;
    first.setInOutPoints(InOutPoints(MediaTime(1.0), MediaTime(2.0)));
    first.setSmartRender(1);
    ProcessParams second;
    second.setChapterPoints(AnyVector(1, 2));
    link.setProcessParams(first);
    link.setProcessParams(second);
    ASSERT_TRUE(link.processParams().inOutPoints());
    EXPECT_EQ(link.processParams().inOutPoints()->outPoint(), MediaTime(2.0));
    EXPECT_TRUE(link.processParams().chapterPoints());
    EXPECT_EQ(link.processParams().smartRender(), 0);
}

TEST(TransVLink, ACopyIsAClosedLinkOverTheSameStreams) {
    Job job(4, QvFramerate::f25p(), QvFramerate::f25p());
    FakeDecoder captions(4, QvFramerate::f25p());
    job.link.addMetaSource(&captions, 4, 0, {});
    ASSERT_EQ(job.open(), 0);
    TransVLink copy = job.link;
    EXPECT_EQ(copy.decoder(), &job.decoder);
    EXPECT_EQ(copy.nrMetaSources(), 1);
    EXPECT_EQ(copy.open(nullptr), 0);
}

TEST(TransVLink, DescribesItself) {
    LogCapture log;
    TransVLink empty;
    empty.log();
    EXPECT_TRUE(log.contains("missing components"));
    FakePlugin plugin;
    plugin.video("scaler").add(new QvVfModule);
    Job job(4, QvFramerate::f25p(), QvFramerate::f25p());
    job.encoder.video.params.set("width", 64);
    ASSERT_EQ(job.open(), 0);
    job.link.log();
    EXPECT_TRUE(log.contains("Processing:"));
    EXPECT_TRUE(log.contains("1. scaler"));
}

}  // namespace
