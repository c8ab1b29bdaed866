#include "core/engine/facts/codepages.h"

#include <set>

#include "tests/support/checks.h"

namespace {

TEST(Codepages, WhatIsOfferedCanBeConvertedAndHasAName) {
    AnyVector list("left over");
    EXPECT_EQ(available_codepages(list), 0);
    std::set<int> numbers;
    for (const Any& entry : list) {
        const int number = entry.asDict().getInt32("identifier", -1);
        EXPECT_TRUE(numbers.empty() || number > *numbers.rbegin());
        numbers.insert(number);
        EXPECT_NE(std::string(entry.asDict().getString("name", "")), "") << number;
        std::u32string text;
        ASSERT_TRUE(qv_platform().decodeCodepage(number, "A1", text)) << number;
        EXPECT_EQ(text, U"A1") << number;
    }
    for (const int number : {874, 932, 936, 949, 950, 1250, 1258, 20866, 28591, 28605, 38598, 51949})
        EXPECT_TRUE(numbers.count(number)) << number;
    for (const int number : {437, 1200, 28602, 65001}) EXPECT_FALSE(numbers.count(number)) << number;
}

}  // namespace
