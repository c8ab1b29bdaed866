#include "core/engine/qvnum.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <limits>

namespace {

TEST(Num, EqualityIsStrictlyWithinTheTolerance) {
    EXPECT_TRUE(QvNum::equ(1, 1.25, 0.26));
    EXPECT_FALSE(QvNum::equ(1, 1.25, 0.25));
    EXPECT_FALSE(QvNum::equ(1, 1, 0));
    EXPECT_FALSE(QvNum::equ(std::nan(""), 1, 1));
}

TEST(Num, RatiosHaveTheSmallestDenominatorOrNone) {
    constexpr double inf = std::numeric_limits<double>::infinity();
    const struct {
        double value;
        int maxDen;
        double tolerance;
        int status, num, den;
    } cases[] = {
        {1.5, 100, 1e-5, 0, 3, 2},
        {0, 2, 1e-5, 0, 0, 1},
        {-0.75, 100, 1e-5, 0, -3, 4},
        {12.0 / 11, 10000, 1e-5, 0, 12, 11},
        {0.5, 2, 1e-5, -1, -1, -1},  // 2 itself is not tried
        {0.5, 3, 1e-5, 0, 1, 2},
        {0.5, -7, 1e-5, -1, -1, -1},
        {M_PI, 100, 1e-9, -1, -1, -1},
        {inf, INT_MAX, 1e-5, -1, -1, -1},
        {std::nan(""), INT_MAX, 1e-5, -1, -1, -1},
    };
    for (const auto& c : cases) {
        int num = 7, den = 7;
        EXPECT_EQ(QvNum::ratio(c.value, num, den, c.maxDen, c.tolerance), c.status) << c.value;
        EXPECT_TRUE(num == c.num && den == c.den) << c.value;
    }
}

}  // namespace
