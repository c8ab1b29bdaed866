// Names with a place for a number.
#include "tarsel/words/numberedname.h"

#include <gtest/gtest.h>

#include "tarsel/words/failure.h"

namespace {

TEST(NumberedNames, NumbersHaveTheirPlaceAndNoOtherFileMatches) {
    const struct {
        const char* name;
        long long number;
        const char *made, *sound;
        const char* other;  // looks like it
    } rows[] = {
        {"pic_%04d.png", 7, "pic_0007.png", "pic.wav", "pic_7.png"},
        {"pic_%04d.png", 12345, "pic_12345.png", "pic.wav", "pic_01234567.png"},
        {"c%d.png", 0, "c0.png", "c.wav", "c00.png"},
        {"c%d.png", 10, "c10.png", "c.wav", "c.png"},
        {"%d", 3, "3", "sound.wav", "3.png"},
        {"%03d.png", 3, "003.png", "sound.wav", "0x3.png"},
        {"a.%02d.b.png", 3, "a.03.b.png", "a.b.wav", "a.03.b.bmp"},
        {"100%%_%d.png", 5, "100%_5.png", "100%.wav", "100%%_5.png"},
        {"%d-take.png", 5, "5-take.png", "take.wav", "-5-take.png"},
        {"#%d.png", 5, "#5.png", "sound.wav", "#5#.png"},
    };
    for (const auto& row : rows) {
        const auto name = NumberedName::parse(row.name);
        ASSERT_TRUE(name) << row.name;
        EXPECT_EQ(name->at(row.number), row.made);
        EXPECT_EQ(name->plain(".wav"), row.sound);
        EXPECT_EQ(name->numberOf(row.made), row.number) << row.made;
        EXPECT_FALSE(name->matches(row.other)) << row.other;
    }
    EXPECT_EQ(NumberedName::parse("c_%d.yuv")->at(1, ".wav"), "c_1.wav");
    EXPECT_EQ(withoutEscapes("100%%%%.png"), "100%%.png");
    EXPECT_EQ(numberedLike("out/c.wav"), "out/c_%d.wav");
    EXPECT_EQ(numberedLike("c"), "c_%d");
}

TEST(NumberedNames, WhatIsNoPlaceForOneNumberIsRefused) {
    for (const char* name : {"100%.wav", "a%%d.wav", "%s.wav", "%4d.wav", "%00d.wav", "a.wav", ""})
        EXPECT_FALSE(NumberedName::parse(name)) << name;
    EXPECT_FALSE(NumberedName::parseStrictly("a%%d.png"));
    for (const char* name :
         {"%d_%d.png", "%d%s.png", "%", "a%.png", "%s.png", "%4d.png", "%00d.png", "%012d.png", "%ld"})
        EXPECT_THROW(NumberedName::parseStrictly(name), Failure) << name;
}

}  // namespace
