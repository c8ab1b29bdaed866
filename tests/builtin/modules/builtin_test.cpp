#include <gtest/gtest.h>

#include <memory>
#include <set>
#include <string>
#include <vector>

#include "builtin/modules.h"
#include "core/engine/init.h"
#include "core/engine/qvcodec.h"
#include "core/engine/qvregistry.h"

namespace {

class Builtin : public testing::Test {
  protected:
    Builtin() { init_wrapper(nullptr); }
    ~Builtin() override { cleanup_wrapper(); }
    std::string decodersFor(const char* ext) const {
        std::string joined;
        for (const Any& name : registry.decoders(ext)) joined.append(name.asString("")).append(" ");
        return joined;
    }
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
    ASSERT_EQ(registry.nrModules(0), 44);
    for (int i = 0; i < 44; ++i) EXPECT_STREQ(registry.module(i)->name(), names[i]);
}

TEST_F(Builtin, DecodersAreFoundByExtension) {
    const struct {
        const char* ext;
        const char* decoders;
    } cases[] = {
        {"mmf", "mvmetadec aumixdec "},
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
        {"", ""},
    };
    for (const auto& c : cases) EXPECT_EQ(decodersFor(c.ext), c.decoders) << c.ext;
    const std::unique_ptr<AnyVector> patterns(registry.inputExts(true, true));
    EXPECT_EQ(patterns->size(), 22);
    EXPECT_GE(patterns->indexOf(Any("*.wav")), 0);
    EXPECT_EQ(patterns->indexOf(Any("*.wav"), patterns->indexOf(Any("*.wav"))), -1);
}

TEST_F(Builtin, AttributesOfSpecialModules) {
    std::set<std::string> internal;
    for (int i = 0; i < registry.nrModules(0); ++i)
        if (registry.module(i)->getAttr("internal") == 1) internal.insert(registry.module(i)->name());
    EXPECT_EQ(internal,
              (std::set<std::string>{"nullsink", "nullmux", "memmux", "memsink", "testgen", "sccdec"}));
    EXPECT_EQ(registry.module("testgen")->getAttr("exts"), Any(AnyVector()));
    EXPECT_FALSE(registry.module("filesink")->getAttr("exts").isValid());
    const Any formats = registry.module("rawvenc")->getAttr("inFOURCC");
    ASSERT_EQ(formats.size(), 6);
    EXPECT_EQ(formats.asVector().at(2), 0x30323449);  // "I420"
    EXPECT_STREQ(registry.module("aprocess")->desc(), "Audio processing pipe");
    EXPECT_STREQ(registry.module("memmux")->desc(), "Memory buffer 'multiplexer'");
    EXPECT_EQ(registry.module("aprocess")->getAttr("type"), 16);
}

// Whatever a row can make answers the interface number of its kind and lists itself as an instance.
TEST_F(Builtin, CodecsFitTheirRows) {
    const std::set<int> known{2, 3, 5, 6, 7, 10, 12, 13, 14, 16};
    for (int i = 0; i < registry.nrModules(0); ++i) {
        QvModule* module = registry.module(i);
        const int type = module->getAttr("type").asInt32(0);
        EXPECT_TRUE(known.count(type)) << module->name();
        const std::unique_ptr<QvCodec> codec(module->create());
        if (!codec) continue;
        const int number = type == 14 ? 12 : type == 16 ? 13 : type;
        EXPECT_NE(codec->getInterface(number), nullptr) << module->name();
        EXPECT_EQ(codec->getInterface(1), nullptr) << module->name();
        EXPECT_STREQ(codec->name(), module->name());
        EXPECT_TRUE(module->codecList().contains(codec.get())) << module->name();
        EXPECT_EQ(codec->getState(), QvCodec::stateCreated) << module->name();
    }
}

TEST(BuiltinModules, StandAlone) {
    const WavDecModule wav;
    EXPECT_STREQ(wav.name(), "wavdec");
    EXPECT_STREQ(wav.displayName(), "WAV file import");
    const QvSubtitleModule subtitle;
    EXPECT_EQ(subtitle.getAttr("type"), QvModuleType::videoFilter);
    const MemInputModule input;
    EXPECT_EQ(input.plugin(), nullptr);
}

}  // namespace
