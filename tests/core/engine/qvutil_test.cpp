#include "core/engine/qvutil.h"

#include <climits>
#include <cmath>

#include "core/engine/files/qvfileutil.h"
#include "core/measure/qvframerate.h"
#include "tests/support/checks.h"

namespace {

TEST(Util, PixelAspects) {
    const struct {
        double aspect;
        int width, height;
        bool broadcast;
        int status, x, y;
    } cases[] = {
        {4.0 / 3, 720, 480, true, 0, 10, 11},  {16.0 / 9, 720, 480, true, 0, 40, 33},
        {1.33335, 720, 576, true, 0, 12, 11},  {16.0 / 9, 720, 576, true, 0, 16, 11},
        {16.0 / 9, 480, 272, true, 0, 1, 1},   {4.0 / 3, 720, 576, false, 0, 16, 15},
        {16.0 / 9, 1920, 1080, true, 0, 1, 1}, {16.0 / 9, 1920, 1088, true, 0, 136, 135},
        {0, 720, 576, true, 0, 1, 1},          {1e300, 1, 1000, false, -1, 1, 1},
    };
    for (const auto& c : cases) {
        int x = 9, y = 9;
        EXPECT_EQ(QvUtil::getPixelAspect(&x, &y, c.aspect, c.width, c.height, c.broadcast), c.status);
        EXPECT_EQ(std::make_pair(x, y), std::make_pair(c.x, c.y))
            << c.width << "x" << c.height << " " << c.aspect;
    }
}

TEST(Util, EffectsSortByPositionAndKeepEqualOnesInOrder) {
    const auto effect = [](const char* name, int position, int front, int on) {
        return Any(AnyDict("name", name, "_position", position, "_front", front, "_on", on));
    };
    AnyVector in(effect("b2", 2, 0, 1), 5, effect("f1", 1, 1, 1), effect("off", 0, 0, 0),
                 effect("b1", 1, 0, 1), AnyDict("name", "bare", "_on", 1), effect("b2x", 2, 0, 1),
                 effect("fm", -3, 1, 1));
    AnyVector front("old"), back("old");
    const auto names = [](const AnyVector& list) {
        AnyVector all;
        for (const Any& item : list) all.append(item.asDict().get("name"));
        return all.join(" ");
    };
    QvUtil::getSortedEffects(in, front, back, true);
    EXPECT_EQ(names(front), "fm f1");
    EXPECT_EQ(names(back), "bare b1 b2 b2x");
    EXPECT_EQ(back.at(0).asDict().getInt32("_position", -1), 0);
    QvUtil::getSortedEffects(in, front, back, false);
    EXPECT_EQ(names(back), "off bare b1 b2 b2x");
    QvUtil::getSortedEffects(in, in, back, false);
    EXPECT_EQ(names(in), "fm f1");
}

TEST(Util, DigestsPrintWordsFromTheirLowByte) {
    // Of 900150983cd24fb0d6963f7d28e17f72, a word at a time.
    const std::string abc = "98500190b04fd23c7d3f96d6727fe128";
    const struct {
        Any value;
        int chars;
        std::string digest;
    } cases[] = {{"", 32, "d98c1dd44b2008f980980e97e42f8ec"},  // 04b2008f loses its zero
                 {"abc", 32, abc},
                 {u"abc", 32, abc},
                 {Any(static_cast<const void*>("abc"), 3), 32, abc},
                 {"abc", 16, abc.substr(0, 16)},
                 {"abc", 11, "985001903c"},
                 {"abc", 1000, abc},
                 {"abc", 1, ""},
                 {"abc", -5, ""}};
    for (const auto& c : cases) EXPECT_EQ(QvUtil::md5Digest(c.value, c.chars), c.digest.c_str()) << c.chars;
    EXPECT_EQ(QvUtil::md5Digest(u"\u00e9", 32), QvUtil::md5Digest("\xC3\xA9", 32));
    EXPECT_EQ(QvUtil::md5Digest(5, 32), Any());
    EXPECT_EQ(QvUtil::md5Digest(Any(static_cast<const void*>("abc")), 32), Any());
}

TEST(Util, FramesAndSamplesAreExactAtTheEndsOfTheirRanges) {
    EXPECT_EQ(QvUtil::pts2FrameNr(27'000'000, 25, false), 25);
    EXPECT_EQ(QvUtil::pts2FrameNr(27'000'000LL * 3600, 29.97, false), 107'892);
    EXPECT_EQ(QvUtil::pts2FrameNr(26'999'999, 25, true), 24);
    EXPECT_EQ(QvUtil::pts2FrameNr(LLONG_MAX, 100, false), static_cast<long long>(LLONG_MAX / 270'000));
    EXPECT_EQ(QvUtil::pts2FrameNr(5, std::nan(""), false), 0);
    const QvFramerate ntsc(QvRatio(30000, 1001));
    EXPECT_EQ(QvUtil::samplesForFrames(5, ntsc, 48000), 8008);
    EXPECT_EQ(QvUtil::samplesForFrames(INT_MAX, ntsc, 192000), 2147483647LL * 192000 * 1001 / 30000);
    EXPECT_EQ(QvUtil::samplesForFrames(5, QvFramerate(QvRatio(0, 1)), 48000), 0);
}

TEST(Util, MacroblocksCountPartsWhole) {
    EXPECT_EQ(QvUtil::macroblocks(1920, 1080), 120 * 68);
    EXPECT_EQ(QvUtil::macroblocks(1, 17), 2);
    EXPECT_EQ(QvUtil::macroblocks(0, 17), 0);
    EXPECT_EQ(QvUtil::macroblocks(INT_MAX, INT_MAX), INT_MAX);
}

}  // namespace
