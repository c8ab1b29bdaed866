#include "core/measure/qvframerate.h"

#include "tests/support/checks.h"

namespace {

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

TEST(QvFramerate, IsFoundByItsKind) {
    const auto film = [](int pulldown) { return QvFramerate(QvRatio(24000, 1001), 0, false, pulldown); };
    const QvFramerate drop(29.97, 0, true);
    const AnyVector rates(24, film(1), film(3), QvFramerate::f29p(), drop);
    const struct {
        QvFramerate rate;
        bool exact, compareDf;
        int found;
    } rows[] = {
        {film(2), false, true, 1},
        {film(2), true, true, -1},
        {film(3), false, true, 2},
        {film(3), true, true, 2},
        {film(0), false, true, -1},
        {drop, false, true, 4},
        {drop, false, false, 3},
        {QvFramerate(29.97, 1), false, false, -1},
        {QvFramerate(25.0), false, false, -1},
    };
    for (const auto& row : rows)
        EXPECT_EQ(row.rate.findInVector(rates, row.exact, row.compareDf), row.found) << &row - rows;
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

}  // namespace
