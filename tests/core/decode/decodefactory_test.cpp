#include "core/decode/decodefactory.h"

#include "core/decode/qvdecoder.h"
#include "core/encode/qvencodepipe.h"
#include "core/engine/qvplugin.h"
#include "core/engine/qvregistry.h"
#include "tests/core/decode/fake_decoder.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"
#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

namespace {

// Decoders of the extension "fake", tried in the order of their priority.
class FakeModule : public QvModule {
  public:
    FakeModule(const char* name, int priority, const char* ext = "fake")
        : QvModule(QvModuleType::decoder, name, "for a test", name) {
        setAttr("exts", AnyVector(Any(ext)));
        setAttr("priority", priority);
    }
    QvCodec* create() override {
        auto* decoder = new FakeDecoder;
        decoder->openResult = openResult;
        decoder->takesFourcc = takesFourcc;
        if (!inits) decoder->init();  // a second init fails
        return _setAttrs(decoder);
    }
    int openResult = 0;
    bool takesFourcc = true, inits = true;
};

class Events : public QvFileOpenCb {
  public:
    int fileOpenStarted(QvFileOpenCbData& data) override {
        all.push_back(std::string("start ") + data.moduleName.asString("-"));
        return -1;
    }
    int fileOpenFinished(int result, QvFileOpenCbData& data) override {
        all.push_back(std::to_string(result) + " " + std::to_string(data.percent) + " " +
                      data.text.asString("-"));
        return -1;
    }
    Texts all;
};

class Factory : public testing::Test {
  protected:
    Factory() {
        first = new FakeModule("first", 1);
        second = new FakeModule("second", 2);
        plugin.addModule(first);
        plugin.addModule(second);
        plugin.addModule(new FakeModule("anonymous", 3, ""));
        qv_registry()->addPlugin(&plugin);
    }
    std::unique_ptr<QvDecodePipe> open(const Any& name, const Any& fourcc = Any(),
                                       const Any* params = nullptr) {
        return std::unique_ptr<QvDecodePipe>(QvDecFactory::decodePipe(name, fourcc, &events, params));
    }

    QvPlugin plugin{"fakes", "Fakes"};  // outlives its stay in the registry
    EngineScope engine;
    FakeModule* first;
    FakeModule* second;
    Events events;
    LogCapture log;
};

TEST_F(Factory, TriesUntilOneOpens) {
    first->openResult = -7;
    const auto decoder = open("some/A.FAKE");
    ASSERT_TRUE(decoder);
    EXPECT_STREQ(decoder->name(), "second");
    EXPECT_TRUE(decoder->getParam("filename") == "some/A.FAKE");
    EXPECT_EQ(events.all,
              (Texts{"start first", "-1 0 Failed to open file 'some/A.FAKE' using 'first'.", "start second",
                     "0 100 Successfully opened file 'some/A.FAKE' with decoder 'second'."}));
    EXPECT_TRUE(log.contains("Failed to open file 'some/A.FAKE' using 'first'.", QvLogMask::error));
}

TEST_F(Factory, FailedTriesAreReportedAndLeaveNothing) {
    first->inits = false;
    second->openResult = -1;
    EXPECT_FALSE(open("a%d.fake"));
    EXPECT_EQ(events.all, (Texts{"start first", "-1 0 Failed to create instance of decoder 'first'.",
                                 "start second", "-1 0 Failed to open file 'a%d.fake' using 'second'."}));
    EXPECT_TRUE(first->codecList().empty());
    EXPECT_TRUE(second->codecList().empty());
}

TEST_F(Factory, TheExtensionChoosesTheDecoders) {
    EXPECT_FALSE(open("a.nothing"));
    EXPECT_EQ(events.all,
              (Texts{"start -", "-1 0 Cannot find appropriate decoder for extension 'nothing'."}));
    EXPECT_TRUE(open("movie"));
    EXPECT_TRUE(log.contains(
        "Cannot determine file extension from filename 'movie', will use default decoder.", QvLogMask::info));
    const auto decoder = open(AnyVector("one", "two.fake", "three.wav"));
    ASSERT_TRUE(decoder);
    const auto& fake = static_cast<FakeDecoder&>(*decoder);
    EXPECT_EQ(fake.given.at("filenames").asVector().size(), 3);
    EXPECT_EQ(events.all.back(),
              "0 100 Successfully opened file 'one, two.fake, three.wav' with decoder 'first'.");
    EXPECT_EQ(log.count("   'two.fake' ..."), 1);
}

TEST_F(Factory, ParametersThatADecoderDoesNotKnowDoNoHarm) {
    first->takesFourcc = false;
    const Any params = 7;
    auto decoder = open("a.fake", "I420", &params);
    ASSERT_TRUE(decoder);
    EXPECT_EQ(static_cast<FakeDecoder&>(*decoder).given.at("openParameters").toInt32(), 7);
    const AnyVector wav("wavdec");
    TempFolder folder;
    EXPECT_FALSE(
        QvDecFactory::decodePipeUsing(folder.write("a.wav", "").c_str(), wav, Any("I420"), &events, &params));
    EXPECT_TRUE(log.contains("Decoder wavdec does not support open parameters.", QvLogMask::error));
}

TEST_F(Factory, AnUnknownModuleEndsTheCall) {
    first->openResult = -1;
    EXPECT_THROW(
        QvDecFactory::decodePipeUsing("a.fake", AnyVector("first", "nobody", "second"), Any(), &events),
        QvAssertFailure);
    EXPECT_TRUE(log.contains("Non-existing module 'nobody' specified", QvLogMask::error));
    EXPECT_EQ(events.all.size(), 2u);
    EXPECT_TRUE(second->codecList().empty());
}

TEST_F(Factory, RestoresFromAStoredState) {
    TempFolder folder;
    const Any file(folder.write("a.fake", "x").c_str());
    auto original = open(file);
    original->setOverride(1, 0, "frameAspect", 2.5);
    AnyDict state;
    original->store(state);

    events.all.clear();
    std::unique_ptr<QvDecodePipe> copy(QvDecFactory::restoreDecoder(file, state, &events));
    ASSERT_TRUE(copy);
    EXPECT_EQ(copy->override(1, 0, "frameAspect").toDouble(), 2.5);
    EXPECT_EQ(events.all[0], "start first");
    EXPECT_EQ(events.all[1].substr(0, 4), "0 0 ");

    // The second entry of a dictionary is for stream 1, which is not there.
    state.set("vidsOverride", AnyVector(Any(AnyDict("codec", "x", "frameAspect", 3.0))));
    copy.reset(QvDecFactory::restoreDecoder(file, state, nullptr));
    ASSERT_TRUE(copy);
    EXPECT_TRUE(copy->override(1, 0, "codec") == "x");
    EXPECT_FALSE(copy->override(1, 0, "frameAspect").isValid());
}

TEST_F(Factory, RestoringNeedsNameModuleAndFile) {
    EXPECT_THROW(QvDecFactory::restoreDecoder("a", AnyDict(), nullptr), QvAssertFailure);
    EXPECT_FALSE(QvDecFactory::restoreDecoder("/no/file", AnyDict("name", "first"), &events));
    EXPECT_EQ(events.all.back(), "-1 0 Cannot find file '/no/file'.");
    TempFolder folder;
    const Any file(folder.write("a.fake", "x").c_str());
    EXPECT_FALSE(QvDecFactory::restoreDecoder(file, AnyDict("name", "nobody"), &events));
    EXPECT_EQ(events.all.back(), "-1 0 Failed to create instance of decoder 'nobody'.");
    first->openResult = -1;
    EXPECT_FALSE(QvDecFactory::restoreDecoder(file, AnyDict("name", "first"), &events));
    EXPECT_TRUE(first->codecList().empty());

    const AnyDict video("width", 64, "height", 64, "framerate", 25.0, "duration", 1.0);
    const AnyDict generated("name", "testgen", "streams", AnyDict("vids", AnyVector(Any(video))));
    const std::unique_ptr<QvDecodePipe> generator(
        QvDecFactory::restoreDecoder("/no/file", generated, nullptr));
    ASSERT_TRUE(generator);
    EXPECT_EQ(generator->nrFrames(0), 25);
}

TEST_F(Factory, EncodePipesComeFromTheirModule) {
    std::unique_ptr<QvEncodePipe> pipe(QvEncFactory::encodePipe(AnyDict("ignored", 1)));
    ASSERT_TRUE(pipe);
    EXPECT_STREQ(pipe->name(), "encpipe");
    pipe.reset();
    cleanup_wrapper();
    LogCapture late;
    EXPECT_FALSE(QvEncFactory::encodePipe());
    EXPECT_TRUE(
        late.contains("[QvEncFactory]Internal error, there is no encode pipe module", QvLogMask::error));
}

}  // namespace
