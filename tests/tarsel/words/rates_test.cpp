// Frame rates as people type them and as the tool prints them.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tarsel/words/timespec.h"
#include "tests/tarsel/refusal.h"

namespace {

TEST(Rates, AreReadExactlyAndWhatIsPrintedCanBeTyped) {
    const struct {
        const char* typed;
        int num, den, interlaced;
        const char* printed;
    } rows[] = {
        {"25", 25, 1, 0, "25"},
        {"25p", 25, 1, 0, "25"},
        {"25.000", 25, 1, 0, "25"},
        {"25/1", 25, 1, 0, "25"},
        {"25i", 25, 1, 1, "25i"},
        {"25b", 25, 1, 2, "25b"},
        {"29.97", 30000, 1001, 0, "29.97"},
        {"29.97i", 30000, 1001, 1, "29.97i"},
        {"30000/1001b", 30000, 1001, 2, "29.97b"},
        {"23.976", 24000, 1001, 0, "23.976"},
        {"23.98", 24000, 1001, 0, "23.976"},
        {"59.94", 60000, 1001, 0, "59.94"},
        {"47.952", 48000, 1001, 0, "47.952"},
        {"119.88", 120000, 1001, 0, "119.88"},
        {"2997/100", 2997, 100, 0, "2997/100"},
        {"12.5", 25, 2, 0, "12.5"},
        {"7.55", 151, 20, 0, "7.55"},
        {"100/3", 100, 3, 0, "100/3"},
        {"1/10", 1, 10, 0, "0.1"},
        {"120", 120, 1, 0, "120"},
        {"50", 50, 1, 0, "50"},
        {"40i", 40, 1, 1, "40i"},
        {"50fi", 50, 1, 1, "50fi"},
        {"59.94fb", 60000, 1001, 2, "59.94fb"},
        {"25fi", 25, 1, 1, "25i"},
        {"1000000000/41708333", 1000000000, 41708333, 0, "1000000000/41708333"},
        {"pal", 25, 1, 0, "25"},
        {"ntsc", 30000, 1001, 0, "29.97"},
        {"film", 24, 1, 0, "24"},
        {"ntsc-film", 24000, 1001, 0, "23.976"},
    };
    for (const auto& row : rows) {
        const QvFramerate rate = parseRate(row.typed, "--rate");
        EXPECT_EQ(rate.rate().num, row.num) << row.typed;
        EXPECT_EQ(rate.rate().den, row.den) << row.typed;
        EXPECT_EQ(rate.interlaced(), row.interlaced) << row.typed;
        EXPECT_EQ(formatRate(rate), row.printed) << row.typed;
        const QvFramerate again = parseRate(formatRate(rate), "--rate");
        EXPECT_TRUE(again.rate() == rate.rate() && again.interlaced() == rate.interlaced()) << row.typed;
    }
}

// Whatever a plug-in says, and all of the named rates.
TEST(Rates, ThatAreNoUsersAreReadAgain) {
    std::vector<QvFramerate> rates = {QvFramerate::f23p(), QvFramerate::f24p(), QvFramerate::f25p(),
                                      QvFramerate::f29p(), QvFramerate::f30p(), QvFramerate::f50p(),
                                      QvFramerate::f59p(), QvFramerate::f60p(), QvFramerate::f50i(),
                                      QvFramerate::f59i(), QvFramerate::f60i()};
    for (const int num : {1, 47, 48, 50, 60, 999, 90000, 2147483647})
        for (const int den : {1, 2, 1001, 417083, 2147483647})
            if (1000.0 * num >= den && num / den <= 100000000) rates.emplace_back(QvRatio(num, den));
    for (const QvFramerate& rate : rates)
        for (const int interlaced : {rate.interlaced(), 1, 2}) {
            QvFramerate one = rate;
            one.setInterlaced(interlaced);
            const std::string text = formatRate(one);
            const QvFramerate again = parseRate(text, "--rate");
            EXPECT_EQ(again.rate().num, one.rate().num) << text;
            EXPECT_EQ(again.rate().den, one.rate().den) << text;
            EXPECT_EQ(again.interlaced(), interlaced) << text;
        }
    for (const char* text : {"29.97df", "59.94df", "29.97", "25"})
        EXPECT_EQ(formatTimecodeRate(parseTimecodeRate(text, "--rate")), text);
    for (const char* text : {"25df", "df", "23.976df"})
        EXPECT_THROW(parseTimecodeRate(text, "--rate"), Failure);
}

TEST(Rates, OfFieldsAreRefusedWithThoseOfFrames) {
    const struct {
        const char *typed, *hint;
    } rows[] = {
        {"50i", "use 25i"},
        {"50b", "use 25b"},
        {"59.94i", "use 29.97i"},
        {"60000/1001b", "use 29.97b"},
        {"60i", "use 30i"},
        {"48i", "use 24i"},
        {"47.952i", "use 23.976i"},
        {"25f", "25i"},
        {"fi", "25i"},
        // These are no rates at all.
        {"", "25i"},
        {"i", "pal"},
        {"25ii", "film"},
        {"PALM", "pal"},
        {"0", "25i"},
        {"-25", "25i"},
        {"nan", "25i"},
        {"25/0", "25i"},
        {"1e400", "25i"},
        {"25 ", "25i"},
    };
    for (const auto& row : rows) {
        Exit exit = Exit::done;
        EXPECT_THAT(refusal([&] { parseRate(row.typed, "--rate"); }, &exit), testing::HasSubstr(row.hint));
        EXPECT_EQ(exit, Exit::usage) << row.typed;
    }
}

}  // namespace
