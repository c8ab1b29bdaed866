#include "plugins/av/picture/picturetimes.h"

#include <gtest/gtest.h>

#include "plugins/av/source/avheaders.h"

namespace {

using av::planPictures;
using av::presentedPictures;

constexpr std::int64_t none = AV_NOPTS_VALUE;

std::vector<av::TimedPicture> at(const std::vector<std::int64_t>& times) {
    std::vector<av::TimedPicture> pictures;
    for (const std::int64_t time : times) pictures.push_back({time, pictures.size()});
    return pictures;
}

std::vector<std::int64_t> grid(int count, double step, double offset = 0) {
    std::vector<std::int64_t> times;
    for (int i = 0; i < count; ++i) times.push_back(static_cast<std::int64_t>(i * step + offset));
    return times;
}

av::IndexedPacket packet(std::int64_t pts, std::int64_t dts, unsigned flags = 0) {
    return {pts, dts, -1, 10, flags, 0, 0};
}

std::vector<std::size_t> order(const std::vector<av::IndexedPacket>& packets, std::int64_t longest = 1000) {
    std::vector<std::size_t> numbers;
    for (const av::TimedPicture& picture : presentedPictures(packets, 10, longest))
        numbers.push_back(picture.packet);
    return numbers;
}

TEST(PicturePlan, ratesThatAllTimesFitAreConstant) {
    const struct {
        const char* what;
        std::vector<std::int64_t> times;
        av::Rational base;
        std::vector<av::Rational> hints;
        QvRatio rate;
        bool variable;
        int frames;
    } cases[] = {
        {"rounded down to milliseconds", grid(100, 1001.0 / 30), {1, 1000}, {}, {30000, 1001}, false, 100},
        {"rounded, from a time between two",
         grid(100, 1000.0 / 24, 500.7),
         {1, 1000},
         {},
         {24, 1},
         false,
         100},
        {"exact", grid(50, 3600), {1, 90000}, {}, {25, 1}, false, 50},
        {"unusual, not stated", grid(90, 80), {1, 1200}, {}, {15, 1}, false, 90},
        {"unusual, stated", grid(44, 1000 / 8.797), {1, 1000}, {{8797, 1000}}, {8797, 1000}, false, 44},
        {"stated, and not so", grid(50, 3600), {1, 90000}, {{50, 1}}, {25, 1}, false, 50},
        {"a picture is missing",
         {0, 1, 3, 4, 5, 6, 7, 8, 9, 10},
         {1, 25},
         {{25, 1}},
         {24000, 1001},
         true,
         11},
        {"one picture", {700}, {1, 1000}, {{30, 1}}, {30, 1}, false, 1},
        {"one picture of no rate", {0}, {1, 1000}, {{0, 1}}, {25, 1}, false, 1},
        {"all at one time", {5, 5, 5}, {1, 1000}, {}, {25, 1}, true, 1},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        const av::PicturePlan plan = planPictures(at(c.times), c.base, c.hints, 1);
        EXPECT_EQ(plan.rate, c.rate) << plan.rate.num << "/" << plan.rate.den;
        EXPECT_EQ(plan.variable, c.variable);
        EXPECT_EQ(plan.frames, c.frames);
        EXPECT_EQ(plan.shown.empty(), !c.variable);
    }
}

TEST(PicturePlan, holesOfADamagedFileAreHeldAtTheStatedRate) {
    const struct {
        const char* what;
        std::vector<std::int64_t> times;
        std::vector<av::Rational> hints;
        QvRatio rate;
        std::vector<std::uint32_t> shown;
    } cases[] = {
        {"the first that fits",
         {100, 140, 181, 340, 380},
         {{0, 1}, {30, 1}, {25, 1}},
         {25, 1},
         {0, 1, 2, 2, 2, 2, 3, 4}},
        {"between two frames", {0, 40, 60, 200}, {{25, 1}}, {24000, 1001}, {0, 1, 2, 2, 2, 3}},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        const av::PicturePlan plan = planPictures(at(c.times), {1, 1000}, c.hints, 40, true);
        EXPECT_EQ(plan.rate, c.rate) << plan.rate.num << "/" << plan.rate.den;
        EXPECT_EQ(plan.shown, c.shown);
        EXPECT_EQ(plan.frames, static_cast<int>(c.shown.size()));
    }
}

TEST(PresentedPictures, comeInTheOrderOfTheirTimes) {
    const struct {
        const char* what;
        std::vector<av::IndexedPacket> packets;
        std::vector<std::size_t> order;
    } cases[] = {
        {"reordered", {packet(0, -10), packet(30, 0), packet(10, 10), packet(20, 20)}, {0, 2, 3, 1}},
        {"not presented", {packet(0, 0, AV_PKT_FLAG_DISCARD), packet(10, 10)}, {1}},
        {"one without a time",
         {packet(0, -10), packet(none, 0), packet(10, 10), packet(20, 20)},
         {0, 2, 3, 1}},
        {"decoding times only", {packet(none, 0), packet(none, 10), packet(none, 20)}, {0, 1, 2}},
        {"no times", {packet(none, none), packet(none, none)}, {0, 1}},
        {"the clock starts again",
         {packet(5000, 5000), packet(5010, 5010), packet(0, 0), packet(10, 10)},
         {0, 1, 2, 3}},
        {"times without sense", {packet(INT64_MAX, INT64_MAX), packet(INT64_MIN + 1, INT64_MIN + 1)}, {0, 1}},
    };
    for (const auto& c : cases) EXPECT_EQ(order(c.packets), c.order) << c.what;
}

// What the sanitizers see here is sums that do not fit.
TEST(PicturePlan, timesAtTheEndsOfTheClockAreTaken) {
    constexpr std::int64_t step = 1LL << 58;
    std::vector<av::IndexedPacket> packets;
    for (int cycle = 0; cycle < 9; ++cycle)
        for (int i = -4; i <= 4; ++i) packets.push_back(packet(i * step, i * step));
    EXPECT_EQ(order(packets, step).size(), packets.size());
}

}  // namespace
