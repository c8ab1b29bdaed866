#include <gmock/gmock.h>

#include <iterator>
#include <memory>
#include <set>

#include "builtin/modules.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "tests/support/checks.h"
#include "tests/support/engine.h"

namespace {

struct Builtin : testing::Test {
    EngineScope engine;
    QvRegistry& registry = *qv_registry();
};

TEST_F(Builtin, ModulesStandInTheirOrder) {
    const char* names[] = {
        "filesink",   "nullsink",  "scaler",    "vprocess", "encpipe",    "dummyaenc",    "rawdec",
        "flipper",    "rawmux",    "rawvenc",   "rawaenc",  "frconvert",  "srconvert",    "deinterlace",
        "logo",       "bobber",    "cropper",   "timecode", "subimport",  "testgen",      "chconvert",
        "aquant",     "aprocess",  "avol",      "rawdump",  "brightness", "animatedlogo", "nullmux",
        "normalizer", "dynamics",  "adelay",    "p2dec",    "userdata",   "rawavimux",    "wavdec",
        "aumixdec",   "mvprocess", "mvmetadec", "memmux",   "memsink",    "sccdec",       "videofade",
        "audiolevel", "panning",
    };
    const int count = static_cast<int>(std::size(names));
    ASSERT_EQ(registry.nrModules(0), count);
    for (int i = 0; i < count; ++i) EXPECT_STREQ(registry.module(i)->name(), names[i]);
}

TEST_F(Builtin, ARestoredValueThatIsRefusedIsNamed) {
    const struct {
        const char *module, *part, *row;
        Any value;
    } cases[] = {
        {"scaler", "state", "outWidth", "wide"},        {"frconvert", "state", "outFramerate", "fast"},
        {"brightness", "state", "gamma", 11.0},         {"rawmux", nullptr, "splitVideo", "often"},
        {"rawavimux", nullptr, "segments", 0},          {"rawvenc", "settingsDict", "width", "wide"},
        {"rawaenc", "settingsDict", "channels", "all"}, {"avol", nullptr, "volume", "loud"}};
    for (const auto& c : cases) {
        const std::unique_ptr<QvCodec> codec(registry.newCodec(c.module));
        AnyDict stored;
        codec->store(stored);
        AnyDict& rows = c.part ? stored[c.part].asDict() : stored;
        ASSERT_TRUE(rows.isSet(c.row)) << c.module;
        EXPECT_EQ(codec->restore(stored), 0) << c.module << codec->errorDesc();
        rows.set(c.row, c.value);
        EXPECT_EQ(codec->restore(stored), QvStatus::invalidParam) << c.module;
        EXPECT_THAT(codec->errorDesc(), testing::HasSubstr(std::string("'") + c.row + "' takes")) << c.module;
    }
}

TEST_F(Builtin, DecodersAreFoundByExtension) {
    for (const auto& [ext, decoders] : {std::pair("mmf", "mvmetadec aumixdec "),
                                        {"mvf", "mvmetadec "},
                                        {"raw", ""},
                                        {"v210", ""},
                                        {"wav", "wavdec "},
                                        {"srt", "subimport "},
                                        {"sub", "subimport "},
                                        {"scc", "sccdec "},
                                        {"sc2", "sccdec "},
                                        {"xml", "p2dec "},
                                        {"xyz", ""},
                                        {"", ""}}) {
        std::string joined;
        for (const Any& name : registry.decoders(ext)) joined += name.asString("") + std::string(" ");
        EXPECT_EQ(joined, decoders) << ext;
    }
    const std::unique_ptr<AnyVector> patterns(registry.inputExts(true, true));
    EXPECT_EQ(patterns->size(), 22);
    EXPECT_EQ(patterns->indexOf(Any("*.wav"), patterns->indexOf(Any("*.wav"))), -1);
}

// Whatever a row can make answers the interface number of its kind and lists itself as an instance.
TEST_F(Builtin, CodecsFitTheirRows) {
    const std::set<int> known{2, 3, 5, 6, 7, 10, 12, 13, 14, 16};
    std::set<std::string> internal;
    for (int i = 0; i < registry.nrModules(0); ++i) {
        QvModule* module = registry.module(i);
        SCOPED_TRACE(module->name());
        if (module->getAttr("internal") == 1) internal.insert(module->name());
        const int type = module->getAttr("type").asInt32(0);
        EXPECT_TRUE(known.count(type));
        const std::unique_ptr<QvCodec> codec(module->create());
        if (!codec) continue;
        // Registered as a video filter, and yet one of sound.
        const bool isSound = type == 16 || std::string(module->name()) == "panning";
        EXPECT_NE(codec->getInterface(type == 14 ? 12 : isSound ? 13 : type), nullptr);
        EXPECT_EQ(codec->getInterface(1), nullptr);
        EXPECT_STREQ(codec->name(), module->name());
        EXPECT_TRUE(module->codecList().contains(codec.get()));
    }
    EXPECT_EQ(internal,
              (std::set<std::string>{"nullsink", "nullmux", "memmux", "memsink", "testgen", "sccdec"}));
    const Any formats = registry.module("rawvenc")->getAttr("inFOURCC");
    ASSERT_EQ(formats.size(), 6);
    EXPECT_EQ(formats.asVector().at(2), 0x30323449);  // "I420"
}

}  // namespace
