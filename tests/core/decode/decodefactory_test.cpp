#include "core/decode/decodefactory.h"

#include "core/decode/qvdecoder.h"
#include "core/engine/modules/qvplugin.h"
#include "core/engine/modules/qvregistry.h"
#include "tests/core/decode/fake_decoder.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"

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
        return _setAttrs(decoder);
    }
    int openResult = 0;
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

struct Factory : testing::Test {
    Factory() {
        first = new FakeModule("first", 1);
        second = new FakeModule("second", 2);
        plugin.addModule(first);
        plugin.addModule(second);
        plugin.addModule(new FakeModule("anonymous", 3, ""));
        qv_registry()->addPlugin(&plugin);
    }
    std::unique_ptr<QvDecodePipe> open(const Any& name) {
        return std::unique_ptr<QvDecodePipe>(QvDecFactory::decodePipe(name, Any(), &events));
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
    EXPECT_EQ(events.all,
              (Texts{"start first", "-1 0 Failed to open file 'some/A.FAKE' using 'first'.", "start second",
                     "0 100 Successfully opened file 'some/A.FAKE' with decoder 'second'."}));
    EXPECT_TRUE(log.contains("Failed to open file 'some/A.FAKE' using 'first'.", QvLogMask::error));
}

TEST_F(Factory, TheExtensionChoosesTheDecoders) {
    EXPECT_FALSE(open("a.nothing"));
    EXPECT_EQ(events.all,
              (Texts{"start -", "-1 0 Cannot find appropriate decoder for extension 'nothing'."}));
    EXPECT_TRUE(open("movie"));
    EXPECT_TRUE(open(AnyVector("one", "two.fake", "three.wav")));
    EXPECT_EQ(events.all.back(),
              "0 100 Successfully opened file 'one, two.fake, three.wav' with decoder 'first'.");
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
}

}  // namespace
