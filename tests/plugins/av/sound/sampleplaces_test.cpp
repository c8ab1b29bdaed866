#include "plugins/av/sound/sampleplaces.h"

#include <gtest/gtest.h>

#include "plugins/av/source/avheaders.h"

namespace {

constexpr std::int64_t none = AV_NOPTS_VALUE;

struct Given {
    std::int64_t pts;
    std::uint32_t count, skipAtStart = 0, skipAtEnd = 0, flags = 0;
};

// Times are in samples, of which there are 1000 a second: a tolerance of 100.
TEST(SamplePlaces, followTheTimesOfPacketsAndWhatTheySkip) {
    const struct {
        const char* what;
        std::vector<Given> packets;
        bool trim, hasZero;
        std::int64_t zero;
        std::vector<long long> starts, kept;
        long long samples;
    } cases[] = {
        {"without pictures the first is sample 0",
         {{500, 10}, {510, 10}},
         true,
         false,
         0,
         {0, 10},
         {10, 10},
         20},
        {"pictures start earlier", {{500, 10}}, true, true, 480, {20}, {10}, 30},
        {"and later", {{500, 10}, {510, 10}}, true, true, 505, {-5, 5}, {10, 10}, 15},
        {"priming longer than a packet",
         {{-15, 10, 15}, {-5, 10}, {5, 10}},
         true,
         true,
         0,
         {0, 0, 5},
         {0, 5, 10},
         15},
        {"padding", {{0, 10}, {10, 10, 0, 4}, {20, 10, 0, 10}}, true, true, 0, {0, 10, 16}, {10, 6, 0}, 16},
        {"padding beyond the packet is none", {{0, 10, 0, 11}}, true, true, 0, {0}, {10}, 10},
        {"packets outside of the edit",
         {{-10, 10, 0, 0, AV_PKT_FLAG_DISCARD}, {0, 10}},
         true,
         true,
         0,
         {0, 0},
         {0, 10},
         10},
        {"what the codec has cut is not cut again",
         {{-4, 6, 4}, {6, 10}},
         false,
         true,
         0,
         {0, 6},
         {6, 10},
         16},
        {"wavering times",
         {{0, 200}, {150, 200}, {480, 200}},
         true,
         true,
         0,
         {0, 200, 400},
         {200, 200, 200},
         600},
        {"a gap", {{0, 10}, {200, 10}}, true, true, 0, {0, 200}, {10, 10}, 210},
        {"a jump of the clock", {{0, 10}, {1LL << 50, 10}}, true, true, 0, {0, 10}, {10, 10}, 20},
        {"no times", {{none, 10}, {none, 10}}, true, false, 0, {0, 10}, {10, 10}, 20},
        {"all of it before the pictures", {{0, 10}}, true, true, 100, {-100}, {10}, 0},
    };
    for (const auto& c : cases) {
        SCOPED_TRACE(c.what);
        std::vector<av::IndexedPacket> packets;
        std::vector<std::uint32_t> counts;
        for (const Given& g : c.packets) {
            packets.push_back({g.pts, g.pts, -1, 0, g.flags, g.skipAtStart, g.skipAtEnd});
            counts.push_back(g.count);
        }
        av::SamplePlaces places;
        places.set(packets, counts, {c.trim}, {1, 1000, 1000, c.hasZero, c.zero});
        for (std::size_t i = 0; i < packets.size(); ++i) {
            EXPECT_EQ(places.of(i).start, c.starts[i]) << i;
            EXPECT_EQ(places.of(i).kept, c.kept[i]) << i;
        }
        EXPECT_EQ(places.samples(), c.samples);
        EXPECT_EQ(places.packetAt(c.samples), packets.size());
    }
}

// What the sanitizers see here is sums that do not fit.
TEST(SamplePlaces, timesAtTheEndsOfTheClockAreTaken) {
    constexpr std::int64_t last = INT64_MAX, units = 1LL << 31;
    std::vector<av::IndexedPacket> packets;
    for (const std::int64_t pts : {-last, last, 0L, -last, last})
        packets.push_back({pts, none, -1, 10, 0, 0, 0});
    const std::vector<std::uint32_t> counts(packets.size(), 10);
    for (const bool hasZero : {false, true})
        for (const std::int64_t zero : {-last - 1, last}) {
            av::SamplePlaces places;
            places.set(packets, counts, {true, 1, 0}, {units - 1, 1, 48000, hasZero, hasZero ? zero : 0});
            EXPECT_GE(places.samples(), 0);
        }
}

}  // namespace
