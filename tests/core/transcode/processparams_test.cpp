#include "core/transcode/processparams.h"

#include "tests/support/checks.h"

namespace {

MediaTime at(long long ticks) { return MediaTime(ticks); }

TEST(InOutPoints, PairsAreReplacedOrAppended) {
    InOutPoints points;
    points.setOutPoint(0, at(20));
    EXPECT_EQ(points, AnyVector(Any(at(0)), Any(at(20))));
    points.setInPoint(at(10));
    EXPECT_EQ(points.duration(), at(10));
    points.setInPoint(1, at(30));
    EXPECT_EQ(points.count(), 2);
    EXPECT_EQ(points.outPoint(1), at(0));
    points.setDuration(1, at(5));
    EXPECT_EQ(points.outPoint(0), at(35)) << "durations go to the first pair";
    points.setDuration(2, at(7));
    EXPECT_EQ(points.count(), 3);
    EXPECT_EQ(points.outPoint(2), at(7));
    points.move(0, at(3));
    EXPECT_EQ(points.inPoint(), at(13));
    EXPECT_EQ(points.outPoint(), at(16)) << "moving loses the length";
    const InOutPoints others(AnyVector(1, "x", 2.0));
    EXPECT_EQ(others.count(), 1);
    const std::function<void()> misuse[] = {
        [&] { points.setInPoint(4, at(1)); },
        [&] { points.setOutPoint(-1, at(1)); },
        [&] { points.setDuration(4, at(1)); },
        [&] { points.inPoint(3); },
        [&] { InOutPoints().duration(); },
        [&] { others.inPoint(); },
        [&] { others.outPoint(); },
    };
    for (const auto& act : misuse) EXPECT_THROW(act(), QvAssertFailure) << &act - misuse;
}

TEST(ProcessParams, AnswersNothingForWhatIsAbsentOrOfAnotherType) {
    ProcessParams params;
    for (const char* key :
         {"inOutPoints", "filters", "chapters", "audioChannelMap", "smartRender", "qualityStats"})
        params.set(key, "text");
    for (const auto& tested : {ProcessParams(), params}) {
        EXPECT_FALSE(tested.inOutPoints() || tested.filters() || tested.chapterPoints() ||
                     tested.audioChannelMap() || tested.getQualityStatsSetup());
        EXPECT_EQ(tested.smartRender(), 0);
    }
}

TEST(ProcessParams, KeepsWhatWasSetAsPlainValues) {
    ProcessParams params;
    params.setInOutPoints(InOutPoints(at(1), at(2)));
    FiltersState filters;
    filters.setFilter("flipper", AnyDict("_on", 1));
    params.setFilters(filters);
    params.setChapterPoints(AnyVector(1, 2));
    params.setSmartRender(2);
    const ProcessParams copy = static_cast<const AnyDict&>(params);
    EXPECT_EQ(copy.inOutPoints()->outPoint(), at(2));
    EXPECT_EQ(copy.filters()->count(), 1);
    EXPECT_EQ(*copy.chapterPoints(), AnyVector(1, 2));
    EXPECT_EQ(copy.smartRender(), 2);
    params.setSmartRender(3);
    EXPECT_EQ(params.get("smartRender"), Any(0));
    MetaProcessParams captions;
    captions.setCcMode(true, false, 3, false, true);
    EXPECT_TRUE(captions.doCc608() && !captions.doCc708());
    EXPECT_TRUE(!captions.valid608_1Fillers() && captions.valid608_2Fillers());
    EXPECT_EQ(captions.ccUserDataFmt(), 3);
}

}  // namespace
