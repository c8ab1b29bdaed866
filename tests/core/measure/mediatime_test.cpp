#include "core/measure/mediatime.h"

#include "core/measure/qvgeometry.h"
#include "tests/support/checks.h"

namespace {

constexpr long long scale = MediaTime::defaultTimescale;

TEST(MediaTime, EveryNamedRateIsExactAtTheDefaultTimescale) {
    using R = QvFramerate;
    for (const auto& rate :
         {R::f23p(), R::f24p(), R::f25p(), R::f29p(), R::f30p(), R::f50p(), R::f59p(), R::f60p()})
        for (long long position : {0LL, 1LL, 2LL, 1001LL, 10000000LL, -5LL}) {
            const MediaTime time(position, rate, scale);
            EXPECT_EQ(time.value() * rate.rate().num, position * scale * rate.rate().den);
            EXPECT_EQ(time.position(rate), position);
        }
    EXPECT_EQ(MediaTime(12345, 44100, scale).position(44100), 12345);
    EXPECT_EQ(MediaTime(1, QvRatio(30000, 1001), scale).value(), 1177176);
}

TEST(MediaTime, TruncatesAtOtherTimescales) {
    EXPECT_EQ(MediaTime(1, QvRatio(30000, 1001), 1000).value(), 33);
    EXPECT_EQ(MediaTime(-1, QvRatio(30000, 1001), 1000).value(), -33);
    EXPECT_EQ(MediaTime(34, 1000).position(QvRatio(30000, 1001)), 1);
    // The display rate of a pulldown does not matter.
    EXPECT_EQ(MediaTime(scale, scale).position(QvFramerate(24.0, 0, false, 1)), 24);
}

TEST(MediaTime, SecondsAndClockTime) {
    EXPECT_EQ(MediaTime(0.0006, 1000).value(), 1);
    EXPECT_EQ(MediaTime(-0.0009, 1000).value(), 0);  // truncation of -0.4
    EXPECT_EQ(MediaTime(QvTime(1, 2, 3, 4, 999), 1000).value(), 3723004);
    EXPECT_EQ(MediaTime(3723004 * 35280LL, scale).time(), QvTime(1, 2, 3, 4, 0));
    EXPECT_EQ(MediaTime(scale + scale / 3000, scale).time(), QvTime(0, 0, 1, 0, 333));
}

TEST(MediaTime, RefusesTimescalesBelowOneAndTwoOfThem) {
    EXPECT_THROW(MediaTime(1, 0LL), QvAssertFailure);
    EXPECT_THROW((void)(MediaTime(1, 10) < MediaTime(2, 20)), QvAssertFailure);
}

TEST(MediaTime, LargeProductsAreExactAndSaturate) {
    const MediaTime late(LLONG_MAX, scale);
    EXPECT_EQ(late.position(48000), LLONG_MAX / 735);
    EXPECT_EQ(late.position(QvRatio(60000, 1001)),
              static_cast<long long>(static_cast<unsigned __int128>(LLONG_MAX) / 588588));
    EXPECT_EQ(MediaTime(LLONG_MAX, QvRatio(1, INT_MAX), scale).value(), LLONG_MAX);
    EXPECT_EQ(MediaTime(LLONG_MIN, QvRatio(1, INT_MAX), LLONG_MAX).value(), LLONG_MIN);
    EXPECT_EQ((late + late).value(), LLONG_MAX);
    (void)MediaTime(LLONG_MIN, 1).time();
    (void)MediaTime(LLONG_MAX, LLONG_MAX).time();
    (void)MediaTime(1e300, scale);
}

}  // namespace
