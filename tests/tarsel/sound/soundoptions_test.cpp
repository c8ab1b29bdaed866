// What is written for a sound: the forms that are read, and those that are refused.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarsel/sound/channelmap.h"
#include "tarsel/sound/soundeffects.h"
#include "tests/tarsel/refusal.h"

namespace {

using testing::HasSubstr;

TEST(ChannelMap, IsReadAndRefused) {
    using Rows = std::vector<std::vector<ChannelMap::Input>>;
    const struct {
        const char* text;
        std::vector<int> sounds;
        Rows rows;
        bool copies;
    } good[] = {
        {"0", {0}, {{{0, 0}}}, true},
        {"1,0", {0}, {{{0, 1}}, {{0, 0}}}, true},
        {"-,3,-", {0}, {{}, {{0, 3}}, {}}, true},
        {"-", {0}, {{}}, true},
        {"0+1+2,-", {0}, {{{0, 0}, {0, 1}, {0, 2}}, {}}, false},
        {"a:1.0,a:1.255+a:1.0", {1}, {{{1, 0}}, {{1, 255}, {1, 0}}}, false},
        {"a:7.1,0,a:2.0", {0, 2, 7}, {{{7, 1}}, {{0, 0}}, {{2, 0}}}, true},
    };
    for (const auto& row : good) {
        const ChannelMap map = parseChannelMap(row.text);
        EXPECT_EQ(map.sounds(), row.sounds) << row.text;
        EXPECT_TRUE(map.rows == row.rows) << row.text;
        EXPECT_EQ(map.copies(), row.copies) << row.text;
    }
    // Sounds 0, 2 and 7 of 2, 1 and 3 channels, side by side.
    const AnyVector matrix = parseChannelMap("a:7.1,0,-,a:2.0+1").matrix({0, 2, 3});
    const auto source = [](int channel) { return Any(AnyDict("channel", channel)); };
    EXPECT_EQ(matrix, AnyVector(Any(AnyVector(source(4))), Any(AnyVector(source(0))), Any(0),
                                Any(AnyVector(source(2), source(1)))));
    for (const char* text :
         {"",     ",",    "0,",      ",0",     "0++1", "+",   "x",    "0 ",          "1.0",   "a:",  "a:1",
          "a:1.", "a:.1", "a:1.1.1", "a:-1.0", "--1",  "0+-", "1000", "99999999999", "b:1.0", "0x1", "0;1"})
        EXPECT_THAT(refusal([&] { parseChannelMap(text); }), HasSubstr("is no list of channels")) << text;
    std::string many = "0", sum = "0";
    for (int i = 1; i < 16; ++i) many += ",0", sum += "+0";
    EXPECT_EQ(parseChannelMap(many).rows.size(), 16u);
    EXPECT_THAT(refusal([&] { parseChannelMap(many + ",0"); }), HasSubstr("more channels than the 16"));
    EXPECT_EQ(parseChannelMap(sum).rows[0].size(), 16u);
    EXPECT_THAT(refusal([&] { parseChannelMap(sum + "+0"); }), HasSubstr("more inputs than the 16"));
}

TEST(Volumes, IsReadAndRefused) {
    const Volumes volumes = parseVolumes({"a:1=-6.5", "+3", "a:12=0"});
    EXPECT_EQ(volumes.of(0), 3);
    EXPECT_EQ(volumes.of(1), -6.5);
    EXPECT_EQ(volumes.of(12), 0);
    EXPECT_EQ(volumes.highest(), 12);
    EXPECT_EQ(parseVolumes({}).of(0), 0);
    for (const auto& given : std::vector<std::vector<std::string>>{{""},
                                                                   {"x"},
                                                                   {"3dB"},
                                                                   {"48.1"},
                                                                   {"-121"},
                                                                   {"nan"},
                                                                   {"inf"},
                                                                   {"+-3"},
                                                                   {"a:1"},
                                                                   {"a:=3"},
                                                                   {"a:x=3"},
                                                                   {"a:-1=3"},
                                                                   {"a:1="},
                                                                   {"1=3"},
                                                                   {"3", "4"},
                                                                   {"a:1=3", "a:1=4"},
                                                                   {"3,4"}})
        EXPECT_THAT(refusal([&] { parseVolumes(given); }), HasSubstr("--volume")) << given.back();
}

TEST(SoundTarget, IsReadAndRefused) {
    const struct {
        const char *text, *mode;
        double level;
    } good[] = {{"true", "loudness", -23}, {"-16", "loudness", -16}, {"loudness:-16.5", "loudness", -16.5},
                {"peak:0", "peak", 0},     {"peak", "peak", -1},     {"rms:-70", "rms", -70}};
    for (const auto& row : good) {
        const SoundTarget target = parseTarget(row.text);
        EXPECT_EQ(target.mode, row.mode) << row.text;
        EXPECT_EQ(target.level, row.level) << row.text;
    }
    for (const char* text : {"", "loud", "3", "-71", "peak:", "peak:1", ":-3", "Peak:-3", "nan", "-16:peak"})
        EXPECT_THAT(refusal([&] { parseTarget(text); }), HasSubstr("--normalize")) << text;
}

}  // namespace
