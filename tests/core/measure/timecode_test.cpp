#include "core/measure/timecode.h"

#include "core/measure/qvframerate.h"
#include "tests/support/checks.h"

namespace {

std::string text(const QvTimecode& timecode, bool semicolons = true) {
    char buffer[QvTimecode::textSize];
    timecode.pprint(buffer, semicolons);
    return buffer;
}

const QvFramerate ntscDf(29.97, 1, true);

TEST(QvTimecode, KnownFrames) {
    const QvFramerate df60(59.94, 0, true), df25(25.0, 0, true), pal(25.0);
    const struct {
        int frame;
        QvFramerate rate;
        const char* text;
    } cases[] = {
        {1800, ntscDf, "00;01;00;02"},   {17982, ntscDf, "00;10;00;00"},
        {107892, ntscDf, "01;00;00;00"}, {107892 * 24, ntscDf, "00;00;00;00"},
        {1800, df25, "00;01;00;02"},     {25 * 3600 * 24 + 1, pal, "00;00;00;01"},
    };
    for (const auto& c : cases) {
        const QvTimecode timecode(c.frame, c.rate, false);
        EXPECT_EQ(text(timecode), c.text) << c.frame;
        EXPECT_EQ(timecode.df(), c.rate.df());
    }
    EXPECT_EQ(text(QvTimecode(1, 2, 3, 4), false), "01:02:03:04");
}

// Counted up from the rule itself: in every minute but each tenth the first numbers do not exist.
TEST(QvTimecode, DropFrameCountsAsTheRuleSays) {
    for (const auto& [rate, fps, drop] :
         {std::tuple(ntscDf, 30, 2), std::tuple(QvFramerate(59.94, 0, true), 60, 4)}) {
        int minute = 0, second = 0, frame = 0;
        for (int number = 0; number < 25 * 60 * fps; ++number) {
            const QvTimecode timecode(number, rate, false);
            ASSERT_TRUE(timecode.minutes() == minute && timecode.seconds() == second) << number;
            ASSERT_EQ(timecode.frames(), frame) << number;
            ASSERT_EQ(timecode.frameNr(rate, false), number);
            if (++frame < fps) continue;
            frame = 0;
            if (++second < 60) continue;
            second = 0;
            if (++minute % 10 != 0) frame = drop;
        }
    }
}

TEST(QvTimecode, ReadsFourPartsOrNone) {
    const struct {
        const char* in;
        const char* out;
        bool df;
    } cases[] = {
        {"01:02:03:04", "01:02:03:04", false}, {"01;02:03", "00:00:00:00", true},
        {":::", "00:00:00:00", false},         {"99999999999:0:0:0", "2147483647:00:00:00", false},
        {nullptr, "00:00:00:00", false},
    };
    for (const auto& c : cases) {
        const QvTimecode timecode(c.in);
        EXPECT_EQ(text(timecode, false), c.out);
        EXPECT_EQ(timecode.df(), c.df);
    }
}

TEST(QvTimecode, ExtremesStayDefined) {
    for (int number : {INT_MIN, -1, INT_MAX})
        for (const auto& rate :
             {ntscDf, QvFramerate(QvRatio(INT_MIN, 1)), QvFramerate(QvRatio(INT_MAX, 1), 0, true)})
            for (bool fields : {false, true}) {
                const QvTimecode timecode(number, rate, fields);
                (void)timecode.seconds(rate, fields);
                EXPECT_LT(text(timecode).size(), static_cast<std::size_t>(QvTimecode::textSize));
            }
    EXPECT_EQ(text(QvTimecode(INT_MIN, INT_MIN, INT_MIN, INT_MIN)).size(), QvTimecode::textSize - 1u);
    (void)QvTimecode(INT_MAX, INT_MAX, INT_MAX, INT_MAX)
        .frameNr(QvFramerate(QvRatio(INT_MAX, 1), 0, true), true);
}

}  // namespace
