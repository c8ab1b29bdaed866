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
        reasons += data.reason.asString("-") + std::string(" ");
        return -1;
    }
    Texts all;
    std::string reasons;  // of each finish
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
    EXPECT_EQ(events.reasons, "will not open - ") << "of the failure only";
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

// A file without a header is opened as what it is said to be, or not at all.
TEST_F(Factory, ParametersAreTakenOrTheFileStaysClosed) {
    TempFolder folder;
    const std::string name = folder.write("a.yuv", std::string(3 * 64 * 48 * 3 / 2, 'x'));
    const Any file(name.c_str());
    const AnyDict format("FOURCC", "I420", "width", 64, "height", 48);
    const auto with = [&](const char* key, const Any& value) {
        AnyDict more = format;
        more.set(key, value);
        return more;
    };
    const auto without = [&](const char* key) {
        AnyDict less = format;
        less.remove(key);
        return less;
    };
    const struct {
        const char* what;
        Any file;
        AnyDict params;
        const char* module;
        const char* error;  // a part; null: it opens
    } rows[] = {
        {"by the extension", file, format, nullptr, nullptr},
        {"by the module", file, with("framerate", Any(50.0)), "rawdec", nullptr},
        {"no format", file, AnyDict(), "rawdec", "rawdec needs 'FOURCC'"},
        {"no size", file, without("height"), nullptr, "rawdec needs 'height'"},
        {"a name that it does not have", file, with("widht", Any(64)), nullptr,
         "rawdec has no parameter 'widht'"},
        {"open parameters of others", file, with("openParameters", Any(AnyDict())), nullptr,
         "rawdec has no parameter 'openParameters'"},
        {"a value of a wrong type", file, with("width", Any("64")), nullptr,
         "rawdec: Invalid value of parameter 'width'"},
        {"a size of zero", file, with("width", Any(0)), nullptr, "Invalid frame size 0x"},
        {"an unknown format", file, with("FOURCC", Any("NOPE")), nullptr, "rawdec: "},
        {"another decoder", file, format, "wavdec", "wavdec has no parameter 'FOURCC'"},
        {"no decoder", file, format, "nobody", "'nobody'"},
        {"no file", Any("/no/file.yuv"), format, nullptr,
         "Failed to open file '/no/file.yuv' using 'rawdec'. Can not open file"},
        {"no extension that is known", Any("a.nothing"), format, nullptr, "extension 'nothing'"},
        {"several, of which none takes it", Any("a.fake"), format, nullptr,
         "first has no parameter 'FOURCC'; second has no parameter 'FOURCC'"},
        {"several without parameters", Any("a.fake"), AnyDict(), nullptr, nullptr},
    };
    for (const auto& row : rows) {
        Any error;
        events.all.clear();
        const std::unique_ptr<QvDecodePipe> decoder(
            QvDecFactory::decodePipeWith(row.file, row.params, &error, row.module, &events));
        EXPECT_EQ(decoder == nullptr, row.error != nullptr) << row.what << error.asString("");
        EXPECT_EQ(events.all.back().substr(0, 2), row.error ? "-1" : "0 ") << row.what;
        if (row.error) {
            EXPECT_NE(std::string(error.asString("")).find(row.error), std::string::npos)
                << row.what << ": " << error.asString("");
        } else if (row.file == file) {
            EXPECT_EQ(decoder->nrFrames(0), 3) << row.what;
        }
    }
    EXPECT_FALSE(QvDecFactory::decodePipeWith(file, AnyDict()));
}

}  // namespace
