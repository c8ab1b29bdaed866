#include "core/media/datetime.h"

#include <gtest/gtest.h>

namespace {

TEST(QvDateTime, PacksInTimeOrder) {
    // Each differs from the one before in the named field, which outweighs all lower ones.
    const QvDateTime moments[] = {
        {{1, 1, 2011}, {0, 0, 0, 0, 0}},  {{1, 1, 2011}, {0, 0, 0, 0, 999}},
        {{1, 1, 2011}, {0, 0, 0, 1, 0}},  {{1, 1, 2011}, {0, 0, 1, 0, 0}},
        {{1, 1, 2011}, {0, 1, 0, 0, 0}},  {{1, 1, 2011}, {23, 59, 59, 999, 999}},
        {{2, 1, 2011}, {0, 0, 0, 0, 0}},  {{31, 1, 2011}, {0, 0, 0, 0, 0}},
        {{1, 12, 2011}, {0, 0, 0, 0, 0}}, {{1, 1, 2012}, {0, 0, 0, 0, 0}},
    };
    for (std::size_t i = 0; i < std::size(moments); ++i) {
        QvDateTime back;
        back.fromI64(moments[i].toI64());
        EXPECT_EQ(back, moments[i]);
        if (i == 0) continue;
        const QvDateTime &a = moments[i - 1], &b = moments[i];
        EXPECT_LT(a.toI64(), b.toI64());
        EXPECT_TRUE(a.date < b.date || (a.date == b.date && a.time < b.time)) << i;
    }
    EXPECT_EQ(QvDateTime({0, 0, 1}, {0, 0, 0, 0, 1}).toI64(), (1LL << 46) + 1);
}

TEST(QvTime, PrintsAndCounts) {
    char text[QvTime::textSize];
    QvTime(1, 2, 3, 4, 5).pprint(text);
    EXPECT_STREQ(text, "01:02:03:004");
    EXPECT_DOUBLE_EQ(QvTime(1, 2, 3, 4, 999).toSecDbl(), 3723.004);
}

}  // namespace
