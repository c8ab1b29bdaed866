// Views of several inputs: every layout, frame by frame, set-ups as files and in memory, and what is refused.
#include "builtin/decoders/views/mvmetadec.h"

#include <gmock/gmock.h>

#include "builtin/decoders/views/viewjoin.h"
#include "core/compose/qvmetafile.h"
#include "core/decode/decodefactory.h"
#include "core/decode/qvtestgenerator.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/pictures.h"

namespace {

using testing::HasSubstr;
constexpr int width = 16, height = 8, frameBytes = width * height * 3 / 2;

class MvMetaDec : public testing::Test {
  protected:
    EngineScope engine;
    TempFolder folder;
    QvViewSetup setup;

    // A raw file of I420 frames, as a view.
    QvViewSetup::View view(const std::string& name, int frames, unsigned seed, int w = width,
                           const QvFramerate& rate = QvFramerate::f25p(), const char* pixel = "I420") {
        const auto bytes = static_cast<std::size_t>(frames) * frameBytes;
        const std::string file = folder.write(name, patternBytes(bytes, seed));
        const std::unique_ptr<QvCodec> raw(qv_registry()->newCodec("rawdec"));
        raw->setParam("FOURCC", pixel);
        raw->setParam("width", w);
        raw->setParam("height", height);
        raw->setParam("framerate", Any(rate));
        QvViewSetup::View view{.file = Any(file.c_str())};
        raw->store(view.state);
        return view;
    }
    std::string contents(const QvViewSetup::View& view, int frame) const {
        return TempFolder::read(view.file.asString())
            .substr(static_cast<std::size_t>(frame) * frameBytes, frameBytes);
    }
    std::unique_ptr<MVMetaDec> open(const char* layout = "") {
        auto decoder = std::make_unique<MVMetaDec>();
        decoder->init();
        AnyDict state;
        setup.store(state);
        decoder->setParam("metaState", state);
        EXPECT_EQ(decoder->setParam("layout", layout), 0);
        fault = decoder->open() == 0 ? "" : decoder->errorDesc();
        return decoder;
    }
    std::string faultOf(const char* layout = "") { return open(layout), fault; }
    std::string faultOfFile(const std::string& text) {
        MVMetaDec decoder;
        decoder.init();
        decoder.setParam("filename", Any(folder.write("x.mvf", text).c_str()));
        return decoder.open() == 0 ? "" : decoder.errorDesc();
    }

    std::string fault;
};

// The bytes of planes that are joined, by a model that goes pixel by pixel.
std::string joined(const std::string& layout, const std::vector<std::string>& views) {
    std::string all;
    std::size_t at = 0;
    for (int plane = 0; plane < 3; ++plane) {
        const std::size_t w = plane ? width / 2 : width, h = plane ? height / 2 : height, n = views.size();
        const bool across = layout == "side-by-side";
        for (std::size_t y = 0; y < (across ? h : h * n); ++y)
            for (std::size_t x = 0; x < (across ? w * n : w); ++x) {
                const std::size_t which = across ? x / w : layout == "top-bottom" ? y / h : y % n;
                const std::size_t row = across ? y : layout == "top-bottom" ? y % h : y / n;
                all += views[which][at + row * w + x % w];
            }
        at += w * h;
    }
    return all;
}

TEST_F(MvMetaDec, EveryLayoutShowsTheSameFrameOfAllViews) {
    setup.views = {view("a.yuv", 6, 1), view("b.yuv", 6, 2), view("c.yuv", 6, 3)};
    for (const std::string& layout : QvViewSetup::layoutNames()) {
        SCOPED_TRACE(layout);
        const auto decoder = open(layout.c_str());
        ASSERT_EQ(fault, "");
        EXPECT_EQ(decoder->QvCodec::getParam("layout"), Any(layout.c_str()));
        const bool chain = layout == "interleaved" || layout == "swapped";
        EXPECT_EQ(decoder->getVideoParam(0, "nrViews"), Any(chain ? 3 : 1));
        EXPECT_EQ(decoder->nrFrames(0), 6);
        for (const int frame : {0, 1, 5, 2, 3}) {
            if (frame != 1 && frame != 3) {
                ASSERT_EQ(decoder->seekToFrame(frame, 0), 0);
            }
            ASSERT_EQ(decoder->readFrame(0), 0);
            std::vector<std::string> parts;
            for (const auto& view : setup.views) parts.push_back(contents(view, frame));
            if (layout == "swapped") std::reverse(parts.begin(), parts.end());
            if (layout == "right") parts = {parts.back()};
            const QvFrame* shown = decoder->getFramePtr(0);
            EXPECT_EQ(shown->frameNr, frame);
            if (layout.find('-') != std::string::npos) {
                EXPECT_EQ(shown->width(), decoder->getVideoParam(0, "width").asInt32());
                EXPECT_EQ(pictureBytes(*shown), joined(layout, parts));
                continue;
            }
            EXPECT_EQ(QvFrame_nrViews(shown), chain ? 3 : 1);
            for (std::size_t i = 0; shown && (chain || i == 0); ++i, shown = shown->nextView())
                EXPECT_EQ(pictureBytes(*shown), parts[i]);
        }
        EXPECT_EQ(decoder->seekToFrame(5, 0), 0);
        EXPECT_EQ(decoder->readFrame(0), 0);
        EXPECT_EQ(decoder->readFrame(0), QvStatus::endOfStream);
        EXPECT_EQ(decoder->seekToFrame(6, 0), QvStatus::endOfStream);
    }
    EXPECT_NEAR(open("side-by-side")->getVideoParam(0, "frameAspect").asDouble(), 6.0, 1e-9);
    EXPECT_NEAR(open("line-by-line")->getVideoParam(0, "frameAspect").asDouble(), 2.0 / 3, 1e-9);
}

TEST_F(MvMetaDec, SetUpsAreFilesAndFilesAreInputs) {
    setup.views = {view("a.yuv", 4, 1), view("b.yuv", 6, 2)};
    setup.layout = QvViewLayout::topBottom;
    const std::string name = folder.file("x.mmf"),
                      wanted =
                          joined("top-bottom", {contents(setup.views[0], 0), contents(setup.views[1], 0)});
    ASSERT_EQ(setup.save(Any(name.c_str())), 0);
    const std::unique_ptr<QvDecodePipe> decoder(QvDecFactory::decodePipe(Any(name.c_str())));
    ASSERT_TRUE(decoder);
    EXPECT_STREQ(decoder->name(), "mvmetadec");
    EXPECT_EQ(decoder->readFrame(0), 0);
    EXPECT_EQ(pictureBytes(*decoder->getFramePtr(0)), wanted);
    // What one view has beyond the other is not shown, and said.
    EXPECT_EQ(decoder->nrFrames(0), 4);
    EXPECT_EQ(decoder->getVideoParam(0, "framesExpected"), Any(6LL));
    EXPECT_EQ(decoder->QvCodec::getParam("inputFiles").asVector().size(), 2);
    // A task stores the decoder, and so does a metafile where there is none yet.
    AnyDict state;
    decoder->store(state);
    EXPECT_TRUE(std::unique_ptr<QvDecodePipe>(QvDecFactory::restoreDecoder(Any(name.c_str()), state)));
    const auto memory = open();
    QvMetafile file;
    ASSERT_EQ(file.saveDecoder(memory.get(), Any(folder.file("y.mvf").c_str())), 0);
    // Views of views: their own picture is one more view.
    QvViewSetup outer;
    for (const char* inner : {"x.mmf", "y.mvf"}) outer.views.push_back({.file = Any(inner)});
    outer.layout = QvViewLayout::right;
    ASSERT_EQ(outer.save(Any(folder.file("z.mvf").c_str())), 0);
    const std::unique_ptr<QvDecodePipe> nested(QvDecFactory::decodePipe(Any(folder.file("z.mvf").c_str())));
    ASSERT_TRUE(nested);
    EXPECT_EQ(nested->readFrame(0), 0);
    EXPECT_EQ(pictureBytes(*nested->getFramePtr(0)), wanted);
}

// The generator links its views itself, and has a sound.
TEST_F(MvMetaDec, AnInputOfSeveralViewsGivesAllOfThem) {
    QvViewSetup::View generated;
    AnyDict video("width", 64, "height", 48, "framerate", QvFramerate::f25p(), "frames", 3, "nrViews", 2);
    AnyDict audio("samples", 4800LL);
    AnyDict streams("vids", AnyVector(Any(video)), "auds", AnyVector(Any(audio)));
    generated.state = AnyDict("name", "testgen", "streams", streams);
    setup.views = {generated, generated};
    const auto chain = open();
    ASSERT_EQ(fault, "");
    EXPECT_EQ(chain->getVideoParam(0, "nrViews"), Any(4));
    for (int i = 0; i < 3; ++i) {
        ASSERT_EQ(chain->readFrame(0), 0);
        EXPECT_EQ(QvFrame_nrViews(chain->getFramePtr(0)), 4);
        EXPECT_EQ(QvFrame_viewIndex(chain->getFramePtr(0)->nextView()->nextView()), 2);
    }
    EXPECT_EQ(chain->nrAudioStreams(), 1);
    EXPECT_EQ(chain->select(qvAudioStream, 0), 0);
    EXPECT_EQ(chain->readSamples(100, 0), 100);
    EXPECT_EQ(chain->getAudioPtr(0)->samples(), 100);
    setup.views.resize(1);
    const auto wide = open("side-by-side");
    EXPECT_EQ(wide->getVideoParam(0, "width"), Any(128));
    EXPECT_EQ(wide->readFrame(0), 0);
}

TEST_F(MvMetaDec, WhatDoesNotGoTogetherIsRefusedWithBothValues) {
    const QvViewSetup::View first = view("a.yuv", 6, 1);
    const struct {
        QvViewSetup::View second;
        const char *layout, *reason;
    } cases[] = {
        {view("b.yuv", 6, 1, 32), "", "its size is 32x8, not 16x8"},
        {view("c.yuv", 6, 1, width, QvFramerate::f50p()), "", "its rate is 50/1 frames/s, not 25/1"},
        {view("d.yuv", 6, 1, width, QvFramerate::f25p(), "YV12"), "", "its pixel format is YV12, not I420"},
        {{.file = Any("none.yuv")}, "", "'none.yuv'): there is no such file"},
        {{.file = first.file, .stream = 3, .state = first.state}, "", "no video stream 3, the last one is 0"},
        {{.file = first.file, .state = AnyDict("name", "scaler")}, "", "Failed to create instance"},
        {{.state = AnyDict("name", "testgen")}, "", "view 2 ('testgen')"},
    };
    for (const auto& c : cases) {
        setup.views = {first, c.second};
        EXPECT_THAT(faultOf(c.layout), HasSubstr(c.reason));
    }
    const QvFramerate interlaced(QvRatio(25, 1), 1);
    setup.views = {view("i.yuv", 6, 1, width, interlaced), view("j.yuv", 6, 1, width, interlaced)};
    EXPECT_EQ(faultOf("top-bottom"), "");
    EXPECT_THAT(faultOf("line-by-line"), HasSubstr("interlaced views can't be joined line by line"));
    setup.views[1].file = Any(folder.write("s.wav", "RIFF").c_str());
    setup.views[1].state.clear();
    EXPECT_THAT(faultOf(), HasSubstr("Failed to open file"));
    EXPECT_EQ(MVMetaDec().setParam("layout", "diagonal"), QvStatus::invalidParam);
    // A disc that loses the end of a file under way: the views never continue out of step.
    setup.views = {view("l.yuv", 20000, 1), view("t.yuv", 20000, 2)};
    const auto decoder = open();
    ASSERT_EQ(fault, "");
    std::filesystem::resize_file(setup.views[1].file.asString(), frameBytes * 2);
    int read = 0;
    while (decoder->readFrame(0) == 0) ++read;
    EXPECT_LT(read, 20000);
    EXPECT_THAT(decoder->errorDesc(), HasSubstr("t.yuv"));
    EXPECT_EQ(decoder->readFrame(0), QvStatus::failed);
    EXPECT_EQ(decoder->seekToFrame(0, 0), 0);
    EXPECT_EQ(decoder->readFrame(0), 0);
}

TEST_F(MvMetaDec, HostileDocumentsAreRefused) {
    const auto element = [](const std::string& text) { return "<Metafile>" + text + "</Metafile>"; };
    std::string many;
    for (int i = 0; i < 17; ++i) many += "<view file='a'/>";
    const struct {
        std::string text, reason;
    } cases[] = {
        {"<MVInterleave layout='wild'><view file='a'/></MVInterleave>", "'wild' is no layout of views"},
        {"<MVInterleave/>", "it has no views"},
        {"<MVInterleave>" + many + "</MVInterleave>", "it has 17 views, more than 16"},
        {"<MVInterleave><view/></MVInterleave>", "view 1: it names no file"},
        {"<MVInterleave><view file='a' stream='-1'/></MVInterleave>", "its stream -1 is not from 0 to 255"},
        {"<MVInterleave><view file='a'><i32>3</i32></view></MVInterleave>", "its decoder has no name"},
        {"<MVInterleave><view file='x.mvf'/></MVInterleave>", "it is an input of itself"},
        {"<MVInterleave><view file='x.mvf'><dict name='mvmetadec'/></view></MVInterleave>",
         "it is an input of itself"},
        {"<MVInterleave><view><dict "
         "name='testgen'><key>streams</key><i32>1</i32></dict></view></MVInterleave>",
         "view 1 ('testgen')"},
    };
    for (const auto& c : cases) EXPECT_THAT(faultOfFile(element(c.text)), HasSubstr(c.reason)) << c.text;
    // Foreign ones are left to others without a word.
    for (const char* text : {"<AudioInterleave><channels/></AudioInterleave>", "<Metafile/>", "<x>"}) {
        qv_log()->clear();
        EXPECT_NE(faultOfFile(element(text)), "");
        AnyVector messages;
        qv_log()->getAll(messages);
        EXPECT_EQ(messages.size(), 0) << text;
    }
}

// Rows that don't end where the next view begins can't be put side by side.
TEST(ViewJoin, OddSizesAreJoinedWhereWholeSamplesMeet) {
    const auto across = QvViewLayout::sideBySide, down = QvViewLayout::topBottom;
    EXPECT_EQ(qvViewJoinFault(across, QvFourcc::BGR3, 15, 7), "");
    EXPECT_EQ(qvViewJoinFault(down, QvFourcc::UYVY, 15, 7), "");
    for (const unsigned fourcc : {QvFourcc::I420, QvFourcc::YUY2, QvFourcc::Y216, QvFourcc::I422})
        EXPECT_THAT(qvViewJoinFault(across, fourcc, 15, 8), HasSubstr("no multiple of 2"));
    EXPECT_THAT(qvViewJoinFault(down, QvFourcc::I420, 16, 7), HasSubstr("a height of 7 is odd"));
    EXPECT_THAT(qvViewJoinFault(across, QvFourcc::v210, 64, 8), HasSubstr("no multiple of 48"));
    for (const unsigned fourcc : {QvFourcc::I422, QvFourcc::v210, QvFourcc::BGR3}) {
        QvFrame a = makePicture(fourcc, 48, 4, 1), b = makePicture(fourcc, 48, 4, 2), wide, high;
        QvFrame* const views[] = {&a, &b};
        wide.init(fourcc, 96, 4);
        high.init(fourcc, 48, 8);
        qvJoinViews(across, views, wide);
        qvJoinViews(down, views, high);
        const int bytes = a.plane_bytes(0) / 4;  // of a row
        for (int row = 0; row < 4; ++row) {
            EXPECT_EQ(std::memcmp(wide.plane(0) + row * wide.stride(0) + bytes,
                                  b.plane(0) + row * b.stride(0), static_cast<std::size_t>(bytes)),
                      0);
            EXPECT_EQ(std::memcmp(high.plane(0) + (row + 4) * high.stride(0), b.plane(0) + row * b.stride(0),
                                  static_cast<std::size_t>(bytes)),
                      0);
        }
    }
}

}  // namespace
