// The plan of the automatic video chain: which filters, in which order, with which parameters.
#include <gtest/gtest.h>

#include <memory>
#include <string>

#include "builtin/modules.h"
#include "core/engine/qvexception.h"
#include "core/filter/jobdescription.h"
#include "core/filter/qvprocesspipe.h"
#include "core/filter/qvprocessutil.h"
#include "tests/support/fake_filters.h"
#include "tests/support/fake_streams.h"
#include "tests/support/log_capture.h"

namespace {

using Pipe = std::unique_ptr<QvVProcessPipe>;

QvFramerate interlaced(QvFramerate rate, int order = 1) {
    rate.setInterlaced(order);
    return rate;
}

VideoJobDescription job(int inWidth, int inHeight, const QvFramerate& inRate, int outWidth, int outHeight,
                        const QvFramerate& outRate) {
    VideoJobDescription job;
    job.inWidth = inWidth;
    job.inHeight = inHeight;
    job.inFramerate = inRate;
    job.outWidth = outWidth;
    job.outHeight = outHeight;
    job.outFramerate = outRate;
    job.inFOURCC = job.outFOURCC = QvFourcc::I420;
    return job;
}

AnyDict filter(const char* name, int position = 0, int front = 0) {
    return AnyDict("name", name, "_on", 1, "_position", position, "_front", front);
}

AnyDict filter(const char* name, const char* key, const Any& value) {
    AnyDict state = filter(name);
    state.set(key, value);
    return state;
}

class VideoChain : public testing::Test {
  protected:
    VideoChain() {
        for (const char* name : {"scaler", "frconvert", "flipper", "cropper", "deinterlace", "logo",
                                 "timecode", "brightness", "bobber"})
            plugin_.video(name);
        plugin_.add(new QvVfModule);
    }
    static Pipe make(const VideoJobDescription& job) { return Pipe(QvProcessUtil::createVideoPipe(job)); }
    static std::string plan(const VideoJobDescription& job) {
        const Pipe pipe = make(job);
        if (!pipe) return "none";
        std::string names;
        for (int i = 0; i < pipe->nrFilters(); ++i)
            names += std::string(i ? " " : "") + pipe->filter(i)->name();
        return names;
    }
    FakePlugin plugin_;
};

const auto p24 = QvFramerate::f24p();
const auto p25 = QvFramerate::f25p();
const auto p50 = QvFramerate::f50p();
const auto i50 = QvFramerate::f50i();
const auto i59 = QvFramerate::f59i();

TEST_F(VideoChain, NothingToDoIsNoPipe) {
    EXPECT_EQ(plan(job(720, 576, p25, 720, 576, p25)), "none");
    EXPECT_EQ(plan(job(720, 576, QvFramerate(25.0005), 720, 576, p25)), "none");
    auto off = job(720, 576, p25, 720, 576, p25);
    off.filters.set("flipper", AnyDict("name", "flipper", "_on", 0));
    off.filters.set("customFilters", AnyVector(Any(AnyDict("name", "logo", "_on", 0)), Any(5)));
    EXPECT_EQ(plan(off), "none");
}

TEST_F(VideoChain, AnyDifferenceOfFormatNeedsTheScaler) {
    const auto same = job(720, 576, p25, 720, 576, p25);
    const auto variant = [&](auto change) {
        auto changed = same;
        change(changed);
        return plan(changed);
    };
    EXPECT_EQ(variant([](auto& j) { j.outWidth = 704; }), "scaler");
    EXPECT_EQ(variant([](auto& j) { j.outHeight = 480; }), "scaler");
    EXPECT_EQ(variant([](auto& j) { j.outFOURCC = QvFourcc::BGR4; }), "scaler");
    EXPECT_EQ(variant([](auto& j) { j.topBlankingLines = 2; }), "scaler");
    EXPECT_EQ(variant([](auto& j) { j.inITU = 1, j.outITU = 2; }), "scaler");
    EXPECT_EQ(variant([](auto& j) { j.inITU = 1, j.outITU = 1; }), "none");
}

TEST_F(VideoChain, TheScalerGetsItsParameters) {
    auto description = job(1920, 1080, p25, 720, 576, p25);
    description.outFOURCC = QvFourcc::YUY2;
    description.topBlankingLines = 3;
    const Pipe pipe = make(description);
    auto& scaler = *pipe->filter("scaler", 0);
    EXPECT_EQ(scaler.getParam("outWidth"), Any(720));
    EXPECT_EQ(scaler.getParam("outHeight"), Any(576));
    EXPECT_EQ(scaler.getParam("topBlankingLines"), Any(3));
    EXPECT_EQ(scaler.getParam("FOURCC"), Any(static_cast<int>(QvFourcc::YUY2)));
    EXPECT_EQ(scaler.getState(), 3);  // the pipe is open
}

TEST_F(VideoChain, ColourMatrix) {
    struct Row {
        int inITU, inHeight, outITU, outHeight;
        int fromTo;  // as 21: from BT.709 to BT.601; 0: none
    };
    const Row rows[] = {
        {0, 1080, 0, 576, 21}, {0, 576, 0, 1080, 12}, {0, 1080, 0, 720, 0}, {0, 576, 0, 480, 0},
        {2, 576, 1, 480, 21},  {1, 1080, 2, 720, 12}, {1, 1080, 0, 576, 0}, {2, 1080, 0, 576, 21},
        {0, 1080, 2, 576, 0},  {0, 1080, 1, 576, 21}, {2, 576, 0, 1080, 0}, {1, 576, 0, 1080, 12},
        {0, 576, 1, 1080, 0},  {0, 576, 2, 1080, 12}, {2, 1080, 2, 576, 0}, {1, 576, 1, 1080, 0},
        {0, 719, 0, 720, 12},  {0, 720, 0, 719, 21},
    };
    for (const auto& row : rows) {
        auto description = job(720, row.inHeight, p25, 720, row.outHeight, p25);
        description.inITU = row.inITU;
        description.outITU = row.outITU;
        const Pipe pipe = make(description);
        ASSERT_TRUE(pipe);
        const auto& scaler = *pipe->filter("scaler", 0);
        EXPECT_EQ(scaler.getParam("inITU").asInt32(0) * 10 + scaler.getParam("outITU").asInt32(0), row.fromTo)
            << row.inITU << " " << row.inHeight << " to " << row.outITU << " " << row.outHeight;
    }
}

TEST_F(VideoChain, AFieldServesWhereHalfTheLinesAreThrownAway) {
    const Pipe pipe = make(job(1920, 1080, i59, 720, 480, QvFramerate::f29p()));
    ASSERT_EQ(pipe->nrFilters(), 2);
    EXPECT_EQ(pipe->filter("deinterlace", 0)->getParam("deinterlace"), Any("top"));
    // The field has 540 lines, which no longer count as a picture of BT.709.
    EXPECT_FALSE(pipe->filter("scaler", 0)->getParam("inITU").isValid());
    EXPECT_EQ(plan(job(1920, 1080, i59, 1280, 720, QvFramerate::f29p())), "scaler");
    EXPECT_EQ(plan(job(1920, 1080, i59, 720, 480, i59)), "scaler");
    EXPECT_EQ(plan(job(1440, 1080, i50, 1440, 540, p25)), "deinterlace");
    EXPECT_EQ(plan(job(720, 1082, i50, 720, 540, p25)),
              "deinterlace");  // 541 lines are cut to an even number
}

TEST_F(VideoChain, ADeinterlacerChangesTheHeightThatTheScalerSees) {
    for (const auto& method : {Any("top"), Any("bottom"), Any("bob"), Any(4), Any("reverse"), Any(3)}) {
        auto description = job(720, 576, i50, 720, 288, p25);
        description.filters.set("deinterlace", filter("deinterlace", "deinterlace", method));
        const bool halves = method != "reverse" && method != Any(3);
        EXPECT_EQ(plan(description), halves ? "deinterlace" : "deinterlace scaler");
    }
}

TEST_F(VideoChain, TheCropperDecidesTheSizeBehindIt) {
    auto description = job(720, 576, p25, 640, 480, p25);
    description.inFrameAspect = 1.5;
    AnyDict state = filter("cropper", "outputWidth", 640);
    state.set("outputHeight", 480);
    description.filters.set("cropper", state);
    const Pipe pipe = make(description);
    ASSERT_EQ(pipe->nrFilters(), 1);
    EXPECT_EQ(pipe->filter(0)->getParam("inputWidth"), Any(720));
    EXPECT_EQ(pipe->filter(0)->getParam("inputHeight"), Any(576));
    EXPECT_EQ(pipe->filter(0)->getParam("inputFrameAspect"), Any(1.5));
}

TEST_F(VideoChain, OrderOfFilters) {
    auto description = job(1920, 1080, i50, 720, 576, p25);
    description.filters.set("flipper", filter("flipper"));
    description.filters.set("cropper", filter("cropper"));
    description.filters.set("deinterlace", filter("deinterlace", "deinterlace", "bob"));
    description.filters.set("customFilters",
                            AnyVector(Any(filter("timecode", 2, 1)), Any(filter("brightness", 1, 0)),
                                      Any(filter("logo", 1, 1)), Any(filter("logo", 2, 0))));
    EXPECT_EQ(plan(description), "logo timecode flipper cropper deinterlace scaler brightness logo");
    description.inFramerate = QvFramerate(50.0, 1);
    EXPECT_EQ(plan(description),
              "logo timecode frconvert flipper cropper deinterlace scaler brightness logo");
    description.outFramerate = QvFramerate(100.0);
    EXPECT_EQ(plan(description),
              "logo timecode flipper cropper deinterlace scaler frconvert brightness logo");
}

TEST_F(VideoChain, RateStages) {
    struct Row {
        QvFramerate in, out;
        const char* plan;
        std::vector<double> rates;  // in and out of each converter
        int interlace;              // of the last; -1 when not set
        int pulldown;
    };
    const double ntsc = 30000.0 / 1001, film = 24000.0 / 1001;
    const Row rows[] = {
        {p50, p25, "frconvert scaler", {50, 25}, -1, -1},
        {p25, p50, "scaler frconvert", {25, 50}, -1, -1},
        {p50, i50, "scaler frconvert", {50, 25}, 1, 0},
        {p50, interlaced(p25, 2), "scaler frconvert", {50, 25}, 2, 0},
        {QvFramerate::f60p(), i50, "scaler frconvert frconvert", {60, 50, 50, 25}, 1, 0},
        {QvFramerate::f23p(), i59, "scaler frconvert", {film, ntsc}, -1, 1},
        {p24, QvFramerate::f60i(), "scaler frconvert", {24, 30}, -1, 1},
        {QvFramerate::f23p(), QvFramerate::f60i(), "scaler frconvert frconvert", {film, 24, 24, 30}, -1, 1},
        {p24, i59, "scaler frconvert frconvert", {24, film, film, ntsc}, -1, 1},
        {p24, QvFramerate::f30p(), "scaler frconvert", {24, 30}, -1, -1},
        {i50, i59, "scaler frconvert", {25, ntsc}, -1, -1},
    };
    for (const auto& row : rows) {
        const auto description = job(720, 576, row.in, 704, 576, row.out);
        EXPECT_EQ(plan(description), row.plan);
        const Pipe pipe = make(description);
        std::vector<double> rates;
        QvVideoFilter* last = nullptr;
        for (int i = 0; auto* converter = pipe->filter("frconvert", i); ++i) {
            rates.push_back(converter->getParam("inFramerate").asFramerate().rate());
            rates.push_back(converter->getParam("outFramerate").asFramerate().rate());
            last = converter;
        }
        ASSERT_EQ(rates.size(), row.rates.size());
        for (std::size_t i = 0; i < rates.size(); ++i) EXPECT_NEAR(rates[i], row.rates[i], 1e-6);
        EXPECT_EQ(last->getParam("interlace").asInt32(-1), row.interlace);
        EXPECT_EQ(last->getParam("pulldown").asInt32(-1), row.pulldown);
    }
}

TEST_F(VideoChain, FiltersThatCanNotBeRestoredAreLeftOut) {
    LogCapture log;
    auto description = job(720, 576, p25, 720, 576, p25);
    AnyDict broken = filter("timecode");
    broken.set("broken", 1);
    description.filters.set("customFilters", AnyVector(Any(filter("nosuch")), Any(broken),
                                                       Any(AnyDict("_on", 1)), Any(filter("logo"))));
    EXPECT_EQ(plan(description), "logo");
    EXPECT_TRUE(log.contains("Can not restore filter nosuch, non existent filter", QvLogMask::error));
    EXPECT_TRUE(log.contains("Can not restore filter timecode from state dict", QvLogMask::error));
}

TEST_F(VideoChain, AUsersConverterComesBeforeTheBuiltInOne) {
    LogCapture log;
    static QvPlugin users("users", "users");
    users.addModule(new FakeModule<FakeVideoFilter>(QvModuleType::videoFilter, "scaler"));
    users.module(0)->setAttr("filename", "/opt/fast_plugin.so");
    qv_registry()->addPlugin(&users);
    const Pipe pipe = make(job(720, 576, p25, 704, 576, p25));
    EXPECT_EQ(pipe->filter(0)->module(), users.module(0));
    EXPECT_EQ(pipe->filter(0)->getState(), 3);
    EXPECT_TRUE(log.contains("Using user supplied scaler:/opt/fast_plugin.so"));
}

TEST_F(VideoChain, TellsTheEncoderWhatIsLeftToDo) {
    struct Row {
        QvFramerate in, out;
        int canDeinterlace;
        const char* filter;
        int told;  // -1: nothing
        bool warned;
    };
    const Row rows[] = {
        {i50, p25, 1, nullptr, 1, false},        {i50, p25, 1, "deinterlace", 0, false},
        {i50, p25, 1, "bobber", 0, false},       {i50, i50, 1, nullptr, 0, false},
        {i50, p25, 0, nullptr, -1, true},        {p25, p25, 0, nullptr, -1, false},
        {i50, p25, 0, "deinterlace", -1, false},
    };
    for (const auto& row : rows) {
        LogCapture log;
        FakeEncodePipe encoder(row.out);
        encoder.video.params.set("canDeinterlace", row.canDeinterlace);
        Pipe pipe(QvVProcessPipe::create());
        if (row.filter) pipe->addFilter(static_cast<QvVideoFilter*>(qv_registry()->newCodec(row.filter)), -1);
        const auto description = job(1920, 1080, row.in, 1280, 720, row.out);
        QvProcessUtil::adjustVideoEncoder(description, row.filter ? pipe.get() : nullptr, &encoder, 0);
        EXPECT_EQ(encoder.video.params.getInt32("deinterlaceVideo", -1), row.told);
        EXPECT_EQ(log.contains("Suggesting usage of deinterlace filter", QvLogMask::warning), row.warned);
        EXPECT_EQ(log.contains("will deinterlace video"), row.told == 1);
    }
}

TEST_F(VideoChain, TellsTheEncoderHowThePictureWasCropped) {
    const std::pair<int, const char*> modes[] = {
        {5, "pad_16_9_to_4_3"}, {4, "crop_16_9_to_4_3"}, {2, "scale"}};
    for (const auto& [mode, word] : modes) {
        FakeEncodePipe encoder(p25);
        Pipe pipe(QvVProcessPipe::create());
        auto* cropper = static_cast<QvVideoFilter*>(qv_registry()->newCodec("cropper"));
        cropper->setParam("mode", mode);
        pipe->addFilter(cropper, -1);
        QvProcessUtil::adjustVideoEncoder(job(720, 576, p25, 720, 576, p25), pipe.get(), &encoder, 0);
        EXPECT_TRUE(encoder.video.params.get("cropMode") == word);
        encoder.video.refused.set("cropMode", 1);
        EXPECT_NO_THROW(
            QvProcessUtil::adjustVideoEncoder(job(720, 576, p25, 720, 576, p25), pipe.get(), &encoder, 0));
    }
}

TEST(VideoChainWithout, AMissingConverterIsNamed) {
    FakePlugin plugin;
    plugin.add(new QvVfModule);
    const auto why = [](const VideoJobDescription& description, const char* module = nullptr) -> std::string {
        try {
            Pipe pipe(QvProcessUtil::createVideoPipeAux(description, module, true));
            return pipe ? "pipe" : "none";
        } catch (const QvAssertFailure& failure) {
            return failure.what();
        }
    };
    EXPECT_NE(why(job(720, 576, p25, 704, 576, p25)).find("filter module 'scaler' is not available"),
              std::string::npos);
    EXPECT_NE(why(job(720, 576, p25, 720, 576, p50)).find("filter module 'frconvert' is not available"),
              std::string::npos);
    auto flipped = job(720, 576, p25, 720, 576, p25);
    flipped.filters.set("flipper", filter("flipper"));
    EXPECT_EQ(why(flipped), "none");
    EXPECT_EQ(why(job(1920, 1080, i50, 1920, 540, p25)).find("none"), std::string::npos);
    plugin.video("scaler");
    EXPECT_NE(why(job(720, 576, p25, 704, 576, p25), "nosuch").find("invalid name for vprocess module"),
              std::string::npos);
}

}  // namespace
