// The filters with curves, against the sentences that define a curve, sample by sample.
#include "builtin/sound/effects/audiolevel.h"
#include "builtin/sound/effects/panning.h"

#include <array>
#include <climits>
#include <cmath>

#include "tests/builtin/sound/sounds.h"

namespace {

using Points = std::vector<LevelCurve::Point>;

AnyVector listOf(const Points& points, int output = -1) {
    AnyVector list;
    for (const auto& [time, volume] : points) {
        AnyDict point("time", time, "volume", volume);
        if (output >= 0) point.set("out_ch", output);
        list.append(Any(point));
    }
    return list;
}

AnyDict listsOf(const char* stem, const std::vector<AnyVector>& lists) {
    AnyDict params;
    for (std::size_t i = 0; i < lists.size(); ++i)
        params.set((std::string(stem) + std::to_string(i)).c_str(), Any(lists[i]));
    return params;
}

// Searched from the start for each time.
double levelAt(Points points, double time) {
    std::stable_sort(points.begin(), points.end(), [](auto& a, auto& b) { return a.time < b.time; });
    LevelCurve::Point last{0.0, 100};
    for (const auto& point : points) {
        if (point.time > time)
            return (point.volume - static_cast<double>(last.volume)) * (time - last.time) /
                       (point.time - last.time) +
                   last.volume;
        last = point;
    }
    return points.empty() ? 100.0 : last.volume;
}

long long bounded(long long value) { return std::clamp<long long>(value, INT_MIN, INT_MAX); }

const Points curves[] = {{},
                         {{0.0, 50}},
                         {{0.05, 0}},
                         {{0.03, 200}, {0.01, 0}, {0.02, 100}},
                         {{0.01, 10}, {0.01, 90}, {0.01, 30}, {0.04, 70}},
                         {{-1.0, 0}, {1.0, 100}},
                         {{0.0, -100}, {0.02, 100}},
                         {{0.0, INT_MAX}, {0.03, INT_MIN}},
                         {{1e12, 0}, {-1e12, 1000}}};

TEST(CustomAudioVolume, FollowsItsCurvesOnEachChannel) {
    for (const int channels : {1, 2, 6, 8}) {
        for (std::size_t shift = 0; shift < std::size(curves); ++shift) {
            std::vector<Points> used;
            std::vector<AnyVector> lists;
            for (std::size_t c = 0; c < 8; ++c) {
                used.push_back(curves[(c + shift) % std::size(curves)]);
                lists.push_back(listOf(used.back()));
            }
            const Values in = noise(static_cast<std::size_t>(channels) * 600, 3);
            Values expected;
            for (std::size_t i = 0; i < in.size(); ++i) {
                const auto at = static_cast<double>(i / static_cast<std::size_t>(channels));
                const double level = levelAt(used[i % static_cast<std::size_t>(channels)], at / 11025);
                expected.push_back(
                    static_cast<int>(bounded(static_cast<long long>(std::trunc(in[i] * (level / 100.0))))));
            }
            EXPECT_EQ(throughBlocks<CustomAudioVolume>(listsOf("volume_list_", lists), in, channels, 11025),
                      expected)
                << channels << " channels, " << shift;
        }
    }
}

TEST(CurveFilters, ChannelsAfterTheEighthStaySilent) {
    const LogCapture log;
    for (const int channels : {9, 16}) {
        const Values in(static_cast<std::size_t>(channels) * 3, 1000);
        OpenedSound<CustomAudioVolume> level;
        AnyDict straight = listsOf("panning_list_", {listOf({{0.0, 100}}, 7)});
        OpenedSound<CAudioPanning> panning(straight);
        const Values leveled = throughFilter(level, in, channels, {1}),
                     panned = throughFilter(panning, in, channels, {1});
        ASSERT_EQ(leveled.size(), in.size());
        ASSERT_EQ(panned.size(), in.size());
        for (std::size_t i = 0; i < in.size(); ++i) {
            const auto channel = i % static_cast<std::size_t>(channels);
            EXPECT_EQ(leveled[i], channel < 8 ? 1000 : 0);
            EXPECT_EQ(panned[i], channel == 7 ? 1000 : 0);
        }
    }
    EXPECT_EQ(log.count("only the first 8 of", QvLogMask::warning), 4) << "once for each sound";
}

TEST(CAudioPanning, AnOutputIsTheMeanOfWhatItHears) {
    // Five inputs, each to several outputs, which are more than the inputs.
    constexpr int channels = 5;
    std::array<std::array<Points, 8>, 8> matrix;
    std::vector<AnyVector> lists;
    for (std::size_t in = 0; in < 8; ++in) {
        AnyVector list;
        for (const std::size_t out : {in % 3, in, std::size_t{6}}) {
            if (!matrix[in][out].empty()) continue;
            matrix[in][out] = curves[(in * 3 + out) % std::size(curves)];
            const AnyVector part = listOf(matrix[in][out], static_cast<int>(out));
            for (const Any& point : part) list.append(point);
        }
        lists.push_back(list);
    }
    const Values in = noise(channels * 700, 9);
    Values expected;
    for (std::size_t i = 0; i < in.size() / channels; ++i) {
        for (std::size_t out = 0; out < 8; ++out) {
            long long sum = 0, parts = 0;
            for (std::size_t from = 0; from < channels; ++from) {
                const Points& curve = matrix[from][out];
                const double level = levelAt(curve, static_cast<double>(i) / 11025);
                if (curve.empty() || level <= 1e-8) continue;
                sum += static_cast<long long>(in[i * channels + from] * level / 100.0);
                ++parts;
            }
            expected.push_back(static_cast<int>(bounded(parts > 1 ? sum / parts : sum)));
        }
    }
    EXPECT_EQ(throughBlocks<CAudioPanning>(listsOf("panning_list_", lists), in, channels, 11025), expected);
}

TEST(CAudioPanning, TheHighestOutputMakesTheChannels) {
    OpenedSound<CAudioPanning> panning(listsOf("panning_list_", {listOf({{0.0, 100}}, 3)}));
    EXPECT_EQ(throughFilter(panning, Values{7, 8}, 2, {1}), (Values{0, 0, 0, 7}));
    // It never falls, until init.
    EXPECT_EQ(panning.setParam("panning_list_0", Any(listOf({{0.0, 100}}, 0))), 0);
    EXPECT_EQ(throughFilter(panning, Values{7, 8}, 2, {1}), (Values{7, 0, 0, 0}));
}

// Whatever is no list of points is refused and the old list stays.
template <class Filter>
void refusesBadLists(const char* name, const AnyDict& good) {
    Filter filter;
    EXPECT_EQ(failureOf([&] { filter.setParam(name, Any(AnyVector())); }), "Not inited");
    filter.init();
    ASSERT_EQ(filter.setParam(name, Any(AnyVector(Any(good)))), 0);
    std::vector<Any> bad = {Any(5), Any("text"), Any(good), Any(AnyVector(Any(5)))};
    for (const char* key : {"time", "volume", "out_ch"}) {
        for (const Any& value : {Any(), Any("1"), Any(std::nan("")), Any(HUGE_VAL), Any(1e300), Any(-1e13)}) {
            AnyDict point = good;
            if (!point.isSet(key)) continue;
            point.set(key, value);
            bad.push_back(Any(AnyVector(Any(good), Any(point))));
        }
    }
    for (const int output : {-1, 8, INT_MAX, INT_MIN}) {
        AnyDict point = good;
        if (!point.isSet("out_ch")) continue;
        point.set("out_ch", output);
        bad.push_back(Any(AnyVector(Any(point))));
    }
    for (const Any& list : bad) {
        EXPECT_EQ(filter.setParam(name, list), QvStatus::invalidParam);
        EXPECT_TRUE(std::strstr(filter.errorDesc(), name));
        EXPECT_EQ(filter.getParam(name), Any(AnyVector(Any(good))));
    }
    QvPcm pcm = soundOf({1, 2}, 2);
    EXPECT_EQ(failureOf([&] { filter.write(pcm); }), "Not opened");
    filter.open();
    pcm.init(1, 2, 2, 48000);
    EXPECT_EQ(failureOf([&] { filter.write(pcm); }), "Only 32 bit samples supported");
    EXPECT_EQ(filter.setParam(name, Any(AnyVector())), 0);
    EXPECT_EQ(filter.getParam(name), Any(AnyVector()));
}

TEST(CurveFilters, AnOutputKeepsItsFormat) {
    QvPcm stereo = soundOf({1, 2}, 2), mono = soundOf({1, 2}, 1);
    OpenedSound<CustomAudioVolume> level;
    ASSERT_EQ(level.write(stereo), 0);
    EXPECT_EQ(level.write(mono), QvStatus::failed);
    EXPECT_EQ(level.samples(), 1);
}

TEST(CurveFilters, BadListsAreRefused) {
    refusesBadLists<CustomAudioVolume>("volume_list_7", AnyDict("time", 1.5, "volume", 30));
    refusesBadLists<CAudioPanning>("panning_list_0", AnyDict("time", 1.5, "volume", 30, "out_ch", 7));
}

TEST(CurveFilters, ListsAreStoredSortedAndDescribed) {
    const AnyVector sorted = listOf({{0.5, 3}, {1.0, 2}, {2.0, 1}}, 4);
    CAudioPanning panning, other;
    panning.init();
    panning.setParam("panning_list_2", Any(listOf({{2.0, 1}, {0.5, 3}, {1.0, 2}}, 4)));
    AnyDict state;
    panning.store(state);
    EXPECT_EQ(state.get("panning_list_2"), Any(sorted));
    other.init();
    EXPECT_EQ(other.restore(state), 0);
    EXPECT_EQ(other.getParam("panning_list_2"), Any(sorted));
    other.init();
    EXPECT_EQ(other.restore(AnyDict("name", other.name(), "panning_list_5", sorted)), 0);
    EXPECT_EQ(other.getParam("panning_list_5"), Any(sorted)) << "a state need not have them all";
    const LogCapture log;
    state.set("panning_list_1", 5);
    EXPECT_EQ(other.restore(state), QvStatus::invalidParam);
    EXPECT_TRUE(log.contains("Can not restore panning_list_1 from state dict", QvLogMask::warning));
    const Any set = other.getParam("paramSet");
    ASSERT_EQ(set.size(), 8);
    EXPECT_EQ(set.asVector().at(7),
              Any(AnyDict("name", "panning_list_7", "guiControl", 1, "type", static_cast<int>(Any::Vector),
                          "description", "volume list")));
}

}  // namespace
