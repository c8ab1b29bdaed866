// The plan of the automatic video chain: which filters, in which order, with which parameters.
#include "builtin/pipes/qvvideopipe.h"
#include "tests/core/filter/chains.h"

namespace {

using Pipe = std::unique_ptr<QvVProcessPipe>;
using Rate = QvFramerate;

const Rate p24 = Rate::f24p(), p25 = Rate::f25p(), p50 = Rate::f50p(), i50 = Rate::f50i(), i59 = Rate::f59i();

// What a test looks at of a filter's parameters.
std::string detail(QvVideoFilter& filter) {
    const AnyDict& known = dynamic_cast<FakeVideoFilter&>(filter).known;
    std::string text;
    for (const char* key :
         {"deinterlace", "inITU", "outITU", "inFramerate", "outFramerate", "interlace", "pulldown"}) {
        const Any& value = known.get(key);
        if (value.isFramerate()) text += Any::sprintf(":%.6g", value.asFramerate().rate().ratio()).asString();
        if (value.isInt()) text += Any::sprintf(":%c%d", *key, value.asInt32()).asString();
        if (value.isText()) text += std::string(":") + value.asString();
    }
    return text;
}

struct Job : VideoJobDescription {
    Job(int width, int height, const Rate& in, int toWidth, int toHeight, const Rate& out, int matrix = 0,
        int toMatrix = 0) {
        inWidth = width, inHeight = height, inFramerate = in, inITU = matrix;
        outWidth = toWidth, outHeight = toHeight, outFramerate = out, outITU = toMatrix;
        inFOURCC = outFOURCC = QvFourcc::I420;
    }
    Job& with(const char* key, const Any& filter) {
        filters.set(key, filter);
        return *this;
    }
    Pipe pipe() const { return Pipe(QvProcessUtil::createVideoPipe(*this)); }
    std::string plan() const { return planOf(pipe(), detail); }
};

class VideoChain : public testing::Test {
  protected:
    VideoChain() {
        for (const char* name : {"scaler", "frconvert", "flipper", "cropper", "deinterlace", "logo",
                                 "timecode", "brightness", "bobber"})
            plugin_.video(name);
        plugin_.add(new QvVfModule);
    }
    FakePlugin plugin_;
};

TEST_F(VideoChain, OnlyWhatDiffersNeedsAFilter) {
    const Rate i25Bottom(25.0, 2), p29 = Rate::f29p(), p60 = Rate::f60p();
    const std::pair<Job, const char*> rows[] = {
        {{720, 576, p25, 720, 576, p25}, "none"},
        {{704, 576, p25, 720, 576, p25}, "scaler"},
        {{720, 576, p25, 720, 480, p25}, "scaler"},
        // The matrix, by what is known of either side, else by the height.
        {{720, 1080, p25, 720, 720, p25}, "scaler"},
        {{720, 576, p25, 720, 576, p25, 2, 1}, "scaler:i2:o1"},
        {{720, 576, p25, 720, 576, p25, 1, 1}, "none"},
        {{720, 1080, p25, 720, 720, p25, 1, 2}, "scaler:i1:o2"},
        {{720, 1080, p25, 720, 576, p25, 1, 0}, "scaler"},
        {{720, 1080, p25, 720, 576, p25, 2, 0}, "scaler:i2:o1"},
        {{720, 1080, p25, 720, 576, p25, 0, 2}, "scaler"},
        {{720, 1080, p25, 720, 576, p25, 0, 1}, "scaler:i2:o1"},
        {{720, 576, p25, 720, 1080, p25, 2, 0}, "scaler"},
        {{720, 576, p25, 720, 1080, p25, 1, 0}, "scaler:i1:o2"},
        {{720, 576, p25, 720, 1080, p25, 0, 1}, "scaler"},
        {{720, 576, p25, 720, 1080, p25, 0, 2}, "scaler:i1:o2"},
        {{720, 719, p25, 720, 720, p25}, "scaler:i1:o2"},
        {{720, 720, p25, 720, 719, p25}, "scaler:i2:o1"},
        // A field is enough where half the lines are thrown away; its 540 lines don't count as BT.709.
        {{1920, 1080, i59, 720, 480, p29}, "deinterlace:top scaler"},
        {{1920, 1080, i59, 1280, 720, p29}, "scaler"},
        {{1920, 1080, i59, 720, 480, i59}, "scaler:i2:o1"},
        {{1440, 1080, i50, 1440, 540, p25}, "deinterlace:top"},
        {{720, 1082, i50, 720, 540, p25}, "deinterlace:top"},  // 541 lines are cut to an even number
        // Rates
        {{720, 576, Rate(25.0005), 720, 576, p25}, "none"},
        {{720, 576, Rate(25.0015), 720, 576, p25}, "frconvert:25.0015:25"},
        {{720, 576, p50, 704, 576, p25}, "frconvert:50:25 scaler"},
        {{720, 576, p25, 704, 576, p50}, "scaler frconvert:25:50"},
        {{720, 576, p50, 704, 576, i50}, "scaler frconvert:50:25:i1:p0"},
        {{720, 576, p50, 704, 576, i25Bottom}, "scaler frconvert:50:25:i2:p0"},
        {{720, 576, p60, 704, 576, i50}, "scaler frconvert:60:50 frconvert:50:25:i1:p0"},
        {{720, 576, p60, 720, 576, Rate(QvRatio(2000000011, 80000000), 1)},
         "frconvert:60:50 frconvert:50:25:i1:p0"},
        {{720, 576, Rate::f23p(), 704, 576, i59}, "scaler frconvert:23.976:29.97:p1"},
        {{720, 576, p24, 704, 576, Rate::f60i()}, "scaler frconvert:24:30:p1"},
        {{720, 576, Rate::f23p(), 704, 576, Rate::f60i()}, "scaler frconvert:23.976:24 frconvert:24:30:p1"},
        {{720, 576, p24, 704, 576, i59}, "scaler frconvert:24:23.976 frconvert:23.976:29.97:p1"},
        {{720, 576, Rate(50.0, 1), 720, 576, i50}, "frconvert:50:25"},
        {{720, 576, p24, 704, 576, Rate::f30p()}, "scaler frconvert:24:30"},
        {{720, 576, i50, 704, 576, i59}, "scaler frconvert:25:29.97"},
    };
    for (const auto& [job, plan] : rows) EXPECT_EQ(job.plan(), plan) << &job - &rows[0].first;
    const Job same(720, 576, p25, 720, 576, p25);
    Job job = same;
    job.with("flipper", AnyDict("name", "flipper", "_on", 0));
    job.with("customFilters", AnyVector(Any(AnyDict("name", "logo", "_on", 0)), Any(5)));
    EXPECT_EQ(job.plan(), "none");
    job.outFOURCC = QvFourcc::BGR4;
    EXPECT_EQ(job.plan(), "scaler");
    job = same;
    job.topBlankingLines = 3;
    const Pipe pipe = job.pipe();
    EXPECT_EQ(dynamic_cast<FakeVideoFilter*>(pipe->filter(0))->known,
              AnyDict("outWidth", 720, "outHeight", 576, "topBlankingLines", 3, "FOURCC",
                      static_cast<int>(QvFourcc::I420)));
    EXPECT_EQ(pipe->filter(0)->getState(), 3) << "the pipe is open";
}

TEST_F(VideoChain, DeinterlacerAndCropperChangeTheSizeThatTheScalerSees) {
    for (const auto& [method, more] : {std::pair{Any("top"), ":top"},
                                       {"bottom", ":bottom"},
                                       {"bob", ":bob"},
                                       {4, ":d4"},
                                       {"reverse", ":reverse scaler"},
                                       {3, ":d3 scaler"}}) {
        Job job(720, 576, i50, 720, 288, p25);
        job.with("deinterlace", stored("deinterlace", AnyDict("deinterlace", method)));
        EXPECT_EQ(job.plan(), std::string("deinterlace") + more);
        // What it makes is progressive, and can be woven.
        job.inFramerate = Rate(50.0, 1);
        job.outFramerate = i50;
        EXPECT_EQ(job.plan(), std::string("deinterlace") + more + " frconvert:50:25:i1:p0");
    }
    Job job(720, 576, p25, 640, 480, p25);
    job.inFrameAspect = 1.5;
    const Pipe pipe =
        job.with("cropper", stored("cropper", AnyDict("outputWidth", 640, "outputHeight", 480))).pipe();
    ASSERT_EQ(pipe->nrFilters(), 1);
    const AnyDict wanted("inputWidth", 720, "inputHeight", 576, "inputFrameAspect", 1.5);
    for (const auto [key, value] : wanted) EXPECT_EQ(pipe->filter(0)->getParam(key), *value) << key;
}

TEST_F(VideoChain, CustomFiltersStandAroundTheAutomaticOnes) {
    const auto at = [](const char* name, int front, int position, const char* more = "_") {
        return Any(stored(name, AnyDict("_front", front, "_position", position, more, 1)));
    };
    const LogCapture log;
    Job job(1920, 1080, i50, 720, 576, p25);
    job.with("flipper", stored("flipper")).with("cropper", stored("cropper"));
    job.with("deinterlace", stored("deinterlace"));
    job.with("customFilters",
             AnyVector(at("timecode", 1, 2), at("brightness", 0, 1), at("logo", 1, 1), at("logo", 0, 2),
                       at("nosuch", 1, 3), at("timecode", 0, 3, "broken"), Any(AnyDict("_on", 1))));
    EXPECT_EQ(job.plan(), "logo timecode flipper cropper deinterlace scaler:i2:o1 brightness logo");
    EXPECT_TRUE(log.contains("Can not restore filter nosuch, non existent filter", QvLogMask::error));
    EXPECT_TRUE(log.contains("Can not restore filter timecode from state dict", QvLogMask::error));
    job.inFramerate = Rate(50.0, 1);
    EXPECT_EQ(job.plan(),
              "logo timecode frconvert:50:25 flipper cropper deinterlace scaler:i2:o1 brightness logo");
    job.outFramerate = Rate(100.0);
    EXPECT_EQ(job.plan(),
              "logo timecode flipper cropper deinterlace scaler:i2:o1 frconvert:50:100 brightness logo");
}

TEST_F(VideoChain, TheBobbersShareOfTheRateIsCounted) {
    const struct {
        Rate out;
        int front, outHeight;
        const char* plan;
    } rows[] = {
        // No field is dropped, though half the lines would do.
        {p50, 1, 288, "bobber scaler"},
        {p50, 0, 288, "scaler bobber"},
        {p25, 1, 288, "bobber frconvert:50:25 scaler"},
        {Rate::f59p(), 1, 288, "bobber scaler frconvert:50:59.9401"},
        {p25, 0, 576, "frconvert:25:12.5 bobber"},
    };
    for (const auto& row : rows) {
        Job job(720, 576, i50, 720, row.outHeight, row.out);
        job.with("customFilters", AnyVector(Any(stored("bobber", AnyDict("_front", row.front)))));
        EXPECT_EQ(job.plan(), row.plan);
    }
}

TEST_F(VideoChain, ConvertersOfAPluginComeBeforeTheBuiltInOnes) {
    static QvPlugin users("users", "users");
    for (const char* name : {"scaler", "frconvert"})
        users.addModule(new FakeModule<FakeVideoFilter>(QvModuleType::videoFilter, name));
    users.module(0)->setAttr("filename", "/opt/own.so");
    qv_registry()->addPlugin(&users);
    users.setAttr("filename", "/opt/all_plugin.so");  // as the registry does for a file
    const LogCapture log;
    const Pipe pipe = Job(720, 576, p24, 704, 576, i59).pipe();
    ASSERT_EQ(pipe->nrFilters(), 3);
    for (int i = 0; i < 3; ++i) EXPECT_EQ(pipe->filter(i)->module(), users.module(i > 0 ? 1 : 0));
    EXPECT_TRUE(log.contains("Using user supplied scaler:/opt/own.so", QvLogMask::info));
    EXPECT_EQ(log.count("Using user supplied framerate converter:/opt/all_plugin.so", QvLogMask::info), 2);
}

TEST_F(VideoChain, TellsTheEncoderWhatIsLeftToDo) {
    const auto adjusted = [](const Rate& in, const Rate& out, QvVProcessPipe* pipe, FakeEncodePipe& encoder) {
        QvProcessUtil::adjustVideoEncoder(Job(1920, 1080, in, 1280, 720, out), pipe, &encoder, 0);
        return encoder.video.params;
    };
    const auto pipeOf = [](const char* name) {
        Pipe pipe(name ? QvVProcessPipe::create() : nullptr);
        if (pipe) pipe->addFilter(static_cast<QvVideoFilter*>(qv_registry()->newCodec(name)), -1);
        return pipe;
    };
    const struct {
        Rate in, out;
        int canDeinterlace;
        const char* filter;
        int reported, warnings;  // -1: nothing
    } rows[] = {
        {i50, p25, 1, nullptr, 1, 0}, {i50, p25, 1, "deinterlace", 0, 0},  {i50, p25, 1, "bobber", 0, 0},
        {i50, i50, 1, nullptr, 0, 0}, {i50, p25, 0, nullptr, -1, 1},       {p25, p25, 0, nullptr, -1, 0},
        {p25, p25, 1, nullptr, 0, 0}, {i50, p25, 0, "deinterlace", -1, 0},
    };
    const char* warning =
        "Input video is interlaced, while output is progressive. Suggesting usage of deinterlace filter";
    for (const auto& row : rows) {
        const LogCapture log;
        FakeEncodePipe encoder(row.out);
        encoder.video.params.set("canDeinterlace", row.canDeinterlace);
        const AnyDict params = adjusted(row.in, row.out, pipeOf(row.filter).get(), encoder);
        EXPECT_EQ(params.getInt32("deinterlaceVideo", -1), row.reported);
        EXPECT_EQ(log.count(warning, QvLogMask::warning), row.warnings);
    }
    const Pipe pipe = pipeOf("cropper");
    for (const auto& [mode, word] :
         {std::pair{5, "pad_16_9_to_4_3"}, {4, "crop_16_9_to_4_3"}, {2, "scale"}}) {
        FakeEncodePipe encoder(p25);
        pipe->filter(0)->setParam("mode", mode);
        EXPECT_EQ(adjusted(p25, p25, pipe.get(), encoder).get("cropMode"), Any(word));
        encoder.video.refused.set("cropMode", 1);
        EXPECT_NO_THROW(adjusted(p25, p25, pipe.get(), encoder));
    }
}

struct ViewsPipe : QvVf {
    using QvVf::QvVf;
    int setParam(const char* name, const Any& value) override { return reported.set(name, value), 0; }
    AnyDict reported;
};

TEST_F(VideoChain, PicturesOfSeveralViewsHaveAPipeOfTheirOwn) {
    plugin_.add(new FakeModule<ViewsPipe>(QvModuleType::videoPipe, "mvprocess"));
    Job job(720, 576, p25, 704, 576, p25);
    EXPECT_FALSE(dynamic_cast<ViewsPipe*>(Pipe(QvProcessUtil::createVideoPipeMV(job, 1)).get()));
    const Pipe pipe(QvProcessUtil::createVideoPipeMV(job, 2));
    EXPECT_EQ(dynamic_cast<ViewsPipe&>(*pipe).reported,
              AnyDict("nrViews", 2, "jobDescription", Any(static_cast<const void*>(&job))));
    EXPECT_EQ(pipe->filter(0)->getState(), 3);
    job.with("customFilters", AnyVector(Any(stored("logo", AnyDict("refuseOpen", -1)))));
    EXPECT_EQ(QvProcessUtil::createVideoPipeMV(job, 2), nullptr) << "it does not open";
}

TEST(VideoChainWithout, AMissingConverterIsNamed) {
    FakePlugin plugin;
    plugin.add(new QvVfModule);
    const auto why = [](const Job& job, const char* module = nullptr) {
        return failureOf([&] { Pipe(QvProcessUtil::createVideoPipeAux(job, module, true)); });
    };
    const Job scaled(720, 576, p25, 704, 576, p25), same(720, 576, p25, 720, 576, p25);
    EXPECT_EQ(why(scaled), "filter module 'scaler' is not available");
    EXPECT_EQ(why(Job(720, 576, p25, 720, 576, p50)), "filter module 'frconvert' is not available");
    EXPECT_EQ(why(Job(same).with("cropper", stored("cropper"))), "filter module 'cropper' is not available");
    EXPECT_EQ(Job(same).with("flipper", stored("flipper")).plan(), "none");
    plugin.video("scaler");
    EXPECT_EQ(why(scaled, "nosuch"), "invalid name for vprocess module");
    Job refused = scaled;
    plugin.video("logo");
    refused.with("customFilters", AnyVector(Any(stored("logo", AnyDict("refuseOpen", -1)))));
    EXPECT_EQ(why(refused), "no failure") << "left to the caller to open";
    EXPECT_NE(failureOf([&] { refused.pipe(); }), "no failure");
}

}  // namespace
