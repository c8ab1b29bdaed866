#include "core/media/qvframerate.h"

#include "tests/support/checks.h"

namespace {

TEST(QvFramerate, NamesAreTheirRates) {
    using R = QvFramerate;
    const struct {
        const QvFramerate& (*constant)();
        void (QvFramerate::*set)();
        bool (QvFramerate::*is)() const;
        QvRatio rate;
        int interlaced;
        const char* text;
    } names[] = {
        {R::f23p, &R::set23p, &R::is23p, {24000, 1001}, 0, "23.98p"},
        {R::f24p, &R::set24p, &R::is24p, {24, 1}, 0, "24p"},
        {R::f25p, &R::set25p, &R::is25p, {25, 1}, 0, "25p"},
        {R::f29p, &R::set29p, &R::is29p, {30000, 1001}, 0, "29.97p"},
        {R::f30p, &R::set30p, &R::is30p, {30, 1}, 0, "30p"},
        {R::f50p, &R::set50p, &R::is50p, {50, 1}, 0, "50p"},
        {R::f59p, &R::set59p, &R::is59p, {60000, 1001}, 0, "59.94p"},
        {R::f60p, &R::set60p, &R::is60p, {60, 1}, 0, "60p"},
        {R::f50i, &R::set50i, &R::is50i, {25, 1}, 1, "50i"},
        {R::f59i, &R::set59i, &R::is59i, {30000, 1001}, 1, "59.94i"},
        {R::f60i, &R::set60i, &R::is60i, {30, 1}, 1, "60i"},
    };
    for (const auto& named : names) {
        QvFramerate rate(30.0, 2, true, 3);
        (rate.*named.set)();
        EXPECT_EQ(rate, named.constant());
        EXPECT_EQ(rate, QvFramerate(named.rate, named.interlaced)) << named.text;
        EXPECT_STREQ(rate.desc(true, true).asString(), named.text);
        // Bottom field first is as interlaced as top field first, and df and pulldown do not matter.
        if (named.interlaced) rate.setInterlaced(2);
        rate.setDf(true);
        rate.setPulldown(1);
        for (const auto& other : names) EXPECT_EQ((rate.*other.is)(), &named == &other) << named.text;
    }
}

TEST(QvFramerate, ReducesAndComparesByTolerance) {
    EXPECT_EQ(QvFramerate(QvRatio(50, 2)).rate(), QvRatio(25, 1));
    EXPECT_EQ(QvFramerate(29.97).rate(), QvRatio(30000, 1001));
    EXPECT_EQ(QvFramerate(QvRatio(2997, 100)), QvFramerate::f29p());
    for (const auto& other : {QvFramerate(QvRatio(2998, 100)), QvFramerate(QvRatio(2997, 100), 1),
                              QvFramerate(29.97, 0, true), QvFramerate(29.97, 0, false, 1)})
        EXPECT_NE(other, QvFramerate::f29p());
    EXPECT_TRUE(QvFramerate(12.5, 1, true, 4).isPAL() && QvFramerate::f50i().isPAL());
    EXPECT_FALSE(QvFramerate::f24p().isPAL());
}

TEST(QvFramerate, DominanceAndDisplayRate) {
    const QvRatio film(24000, 1001), ntsc(30000, 1001), twice(48000, 1001);
    for (const auto& [pulldown, display] : {std::pair{0, film}, {1, ntsc}, {3, ntsc}, {4, twice}, {5, film}})
        EXPECT_EQ(QvFramerate(film, 0, false, pulldown).displayRate(), display) << pulldown;
    EXPECT_EQ(QvFramerate(QvRatio(25, 2), 0, false, 4).displayRate(), QvRatio(25, 1));
    EXPECT_EQ(QvFramerate(QvRatio(30, 7), 0, false, 2).displayRate(), QvRatio(37, 7));

    const int reversed[] = {0, 2, 1, 1};
    for (int scan = 0; scan < 4; ++scan) {
        QvFramerate rate(25.0, scan);
        EXPECT_EQ(rate.isTopFirst(), scan == 1);
        rate.reverseDominance();
        EXPECT_EQ(rate.interlaced(), reversed[scan]);
    }
}

TEST(QvFramerate, DescribesItself) {
    const struct {
        QvFramerate rate;
        bool df, pulldown;
        const char* text;
    } cases[] = {
        {QvFramerate(QvRatio(24000, 1001), 0, false, 1), true, true, "23.98p -> 59.94i PD"},
        {QvFramerate(QvRatio(24000, 1001), 0, false, 3), true, true, "23.98p -> 59.94i PD(A)"},
        {QvFramerate(QvRatio(24000, 1001), 0, false, 3), true, false, "23.98p"},
        {QvFramerate(QvRatio(30000, 1001), 1, true, 0), true, true, "59.94i DF"},
        {QvFramerate(QvRatio(30000, 1001), 1, true, 0), false, true, "59.94i"},
        {QvFramerate(25.0, 1, false, 4), true, true, "50i -> 100p PD"},
        {QvFramerate(25.0, 0, false, 9), true, true, "25p -> 50i PD"},
        {QvFramerate(12.5), true, true, "12.5p"},
        {QvFramerate(7.5), true, true, "7.5p"},
        {QvFramerate(7.49), true, true, " 7.49p"},
        {QvFramerate(QvRatio(1, 0)), true, true, "0p"},
    };
    for (const auto& c : cases) EXPECT_STREQ(c.rate.desc(c.df, c.pulldown).asString(), c.text);
}

TEST(QvFramerate, IsFoundInAVector) {
    const AnyVector rates(Any("25"), Any(QvFramerate(25.0, 2, false, 1)), Any(QvFramerate(25.0, 1, true, 3)),
                          Any(QvFramerate(29.97, 0, true)), Any(QvFramerate(29.97)),
                          Any(QvFramerate(25.0, 0, true)));
    const struct {
        QvFramerate rate;
        bool exact, df;
        int index;
    } cases[] = {
        {QvFramerate(25.0, 1, false, 2), false, false, 1},  // kinds of interlace and pulldown
        {QvFramerate(25.0, 1, false, 2), true, false, -1},
        {QvFramerate(25.0, 1, false, 3), false, false, 2},  // the advanced kind is alone
        {QvFramerate(25.0, 1, false, 3), true, true, 2},    // df counts for NTSC only
        {QvFramerate(29.97), false, true, 4},
        {QvFramerate(29.97), false, false, 3},
        {QvFramerate(25.0), true, true, 5},
    };
    for (const auto& c : cases) EXPECT_EQ(c.rate.findInVector(rates, c.exact, c.df), c.index);
}

}  // namespace
