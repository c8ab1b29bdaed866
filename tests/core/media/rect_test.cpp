#include "core/media/rect.h"

#include <gtest/gtest.h>

#include <climits>

namespace {

TEST(QvRect, SidesAndSize) {
    QvRect rect(10, 20, 13, 24);
    EXPECT_TRUE(rect.width() == 3 && rect.height() == 4);
    rect.setWidth(5);
    rect.setHeight(7);
    EXPECT_EQ(rect, QvRect(10, 20, 15, 27));
    rect.moveTo({-1, -2});
    rect.move({3, 3});
    EXPECT_EQ(rect, QvRect(2, 1, 7, 8));
    rect.setTopLeft({0, 0});
    rect.setBottomRight({9, 9});
    EXPECT_EQ(rect, QvRect(0, 0, 9, 9));
}

TEST(QvRect, ContainsItselfAndNothingThatSticksOut) {
    const QvRect outer(0, 0, 10, 10);
    EXPECT_TRUE(outer.contains(outer));
    EXPECT_TRUE(outer.contains({2, 3, 4, 5}));
    for (const QvRect& out :
         {QvRect(-1, 0, 5, 5), QvRect(0, -1, 5, 5), QvRect(5, 5, 11, 6), QvRect(5, 5, 6, 11)})
        EXPECT_FALSE(outer.contains(out));
}

TEST(QvRect, ExtremesWrap) {
    QvRect rect(INT_MIN, INT_MIN, INT_MAX, INT_MAX);
    EXPECT_EQ(rect.width(), -1);
    rect.move({1, 1});
    rect.moveTo({INT_MAX, INT_MAX});
    rect.setWidth(INT_MAX);
    EXPECT_EQ(rect.right(), -2);
}

}  // namespace
