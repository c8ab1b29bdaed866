#include "core/engine/modules/moduletraits_p.h"

#include <gtest/gtest.h>

#include "tests/support/fake_filters.h"

namespace {

ModuleTraits traitsOf(const char* name) { return qvModuleTraits(name, qv_registry()->module(name)); }

QvModule* module(const char* name, const char* attribute = nullptr, const Any& value = Any()) {
    auto* made = new FakeModule<FakeVideoFilter>(QvModuleType::videoFilter, name);
    if (attribute) made->setAttr(attribute, value);
    return made;
}

// Modules of a plug-in that set no attribute of the engine's.
TEST(ModuleTraits, AFixedNameIsEnough) {
    FakePlugin plugin;
    plugin.add(module("ddaenc")).add(module("divxvenc")).add(module("scaler")).add(module("mine"));
    EXPECT_EQ(traitsOf("ddaenc"), ModuleTraits{.family = CodecFamily::dolby});
    EXPECT_EQ(traitsOf("divxvenc"), ModuleTraits{.ownStatistics = true});
    EXPECT_EQ(traitsOf("scaler"), ModuleTraits{.onlyScales = true});
    EXPECT_EQ(traitsOf("mine"), ModuleTraits());
    EXPECT_EQ(traitsOf("asfmux"), ModuleTraits{.watchDiscSpace = true}) << "nobody has registered it";
    EXPECT_EQ(traitsOf("bobber"), ModuleTraits{.deinterlaces = true});
    EXPECT_EQ(traitsOf("frconvert"), ModuleTraits{.repeatsFrames = true});
    const std::unique_ptr<QvCodec> codec(qv_registry()->newCodec("scaler"));
    EXPECT_TRUE(qvModuleTraits(*codec).onlyScales);
}

TEST(ModuleTraits, AnAttributeWins) {
    FakePlugin plugin;
    plugin.add(module("ddaenc", "codecFamily", "aac")).add(module("ddproaenc", "codecFamily", "none"));
    plugin.add(module("scaler", "onlyScales", 0)).add(module("mine", "onlyScales", 1));
    plugin.add(module("stats", "ownStatistics", 1)).add(module("muxer", "watchDiscSpace", 1));
    plugin.add(module("sound", "convertsFormat", 1)).add(module("camera", "codecFamily", "dv"));
    EXPECT_EQ(traitsOf("ddaenc").family, CodecFamily::aac);
    EXPECT_EQ(traitsOf("ddproaenc").family, CodecFamily::none);
    EXPECT_EQ(traitsOf("scaler"), ModuleTraits());
    EXPECT_EQ(traitsOf("mine"), ModuleTraits{.onlyScales = true});
    EXPECT_EQ(traitsOf("stats"), ModuleTraits{.ownStatistics = true});
    EXPECT_EQ(traitsOf("muxer"), ModuleTraits{.watchDiscSpace = true});
    EXPECT_EQ(traitsOf("sound"), ModuleTraits{.convertsFormat = true});
    plugin.add(module("resampler", "convertsRate", 1)).add(module("adelay", "delays", 0));
    plugin.add(module("weaver", "deinterlaces", 1)).add(module("frconvert", "repeatsFrames", 0));
    plugin.add(module("plain", "uncompressed", 1)).add(module("stills", "wholePictures", 1));
    EXPECT_EQ(traitsOf("resampler"), ModuleTraits{.convertsRate = true});
    EXPECT_EQ(traitsOf("weaver"), ModuleTraits{.deinterlaces = true});
    EXPECT_EQ(traitsOf("plain"), ModuleTraits{.uncompressed = true});
    EXPECT_EQ(traitsOf("stills"), ModuleTraits{.wholePictures = true});
    for (const char* name : {"adelay", "frconvert"}) EXPECT_EQ(traitsOf(name), ModuleTraits()) << name;
    EXPECT_EQ(traitsOf("camera").family, CodecFamily::dv);
}

}  // namespace
