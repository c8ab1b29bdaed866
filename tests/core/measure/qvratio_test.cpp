#include "core/measure/qvratio.h"

#include <gtest/gtest.h>

#include "core/measure/qvnum.h"

namespace {

TEST(QvRatio, FindsTheRatioOfADouble) {
    const struct {
        double value;
        int maxDen, status;
        QvRatio ratio;
    } cases[] = {
        {29.97, 10000, 0, {30000, 1001}},
        {29.9699, 10000, 0, {2997, 100}},  // too far for the name and any denominator, but not three decimals
        {23.98, 10000, 0, {1199, 50}},
        {25.0, 1, -1, {-1, -1}},
        {3.14159265358979, 5, -1, {-1, -1}},
        {__builtin_nan(""), 10000, -1, {-1, -1}},
    };
    for (const auto& c : cases) {
        QvRatio ratio;
        EXPECT_EQ(ratio.fromDouble(c.value, c.maxDen), c.status) << c.value;
        EXPECT_EQ(ratio, c.ratio) << c.value;
    }
    // A negative value is truncated towards 0 and never rounded away from it.
    for (const auto& [value, status] : {std::pair{2.9997, 0}, {-2.9997, -1}, {-3.0003, 0}}) {
        int num = 0, den = 0;
        EXPECT_EQ(QvNum::ratio(value, num, den, 100, 0.001), status) << value;
        EXPECT_EQ(num, status ? -1 : value < 0 ? -3 : 3);
    }
}

TEST(QvRatio, RescalesCounts) {
    EXPECT_EQ(QvRatio::multyplyByRatio(100, {25, 1}, {25, 1}), 100);
    EXPECT_EQ(QvRatio::multyplyByRatio(30000, {30000, 1001}, {25, 1}), 30000LL * 30000 / (1001LL * 25));
    EXPECT_EQ(QvRatio::multyplyByRatio(-7, {2, 1}, {3, 1}), -14 / 3);
    // The divisor keeps its low 32 bits only.
    const auto wrapped = static_cast<int>(static_cast<unsigned>(100000LL * 60000));
    EXPECT_EQ(QvRatio::multyplyByRatio(1000000, {5, 100000}, {60000, 7}), 1000000LL * 5 * 7 / wrapped);
}

}  // namespace
