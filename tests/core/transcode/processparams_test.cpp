#include "core/transcode/processparams.h"

#include <gtest/gtest.h>

#include "core/engine/qvexception.h"

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
    EXPECT_THROW(points.setInPoint(3, at(1)), QvAssertFailure);
    EXPECT_THROW(points.setOutPoint(-1, at(1)), QvAssertFailure);
    EXPECT_THROW(points.inPoint(2), QvAssertFailure);
    EXPECT_THROW(InOutPoints().duration(), QvAssertFailure);
}

TEST(InOutPoints, DurationsGoToTheFirstPair) {
    InOutPoints points(at(10), at(20));
    points.setInPoint(1, at(100));
    points.setDuration(1, at(5));
    EXPECT_EQ(points.outPoint(0), at(105));
    EXPECT_EQ(points.outPoint(1), at(0));
    points.setDuration(2, at(7));
    EXPECT_EQ(points.count(), 3);
    EXPECT_EQ(points.outPoint(2), at(7));
    EXPECT_THROW(points.setDuration(4, at(1)), QvAssertFailure);
}

TEST(InOutPoints, MovingLosesTheLength) {
    InOutPoints points(at(10), at(20));
    points.move(0, at(3));
    EXPECT_EQ(points.inPoint(), at(13));
    EXPECT_EQ(points.outPoint(), at(16));
}

TEST(InOutPoints, AStoredListOfOtherThingsHoldsNoPoints) {
    const InOutPoints points(AnyVector(1, "x", 2.0));
    EXPECT_EQ(points.count(), 1);
    EXPECT_THROW(points.inPoint(), QvAssertFailure);
    EXPECT_THROW(points.outPoint(), QvAssertFailure);
}

TEST(ProcessParams, AnswersNothingForWhatIsAbsentOrOfAnotherType) {
    ProcessParams params;
    for (const char* key :
         {"inOutPoints", "filters", "chapters", "audioChannelMap", "smartRender", "qualityStats"})
        params.set(key, "text");
    for (const auto& tested : {ProcessParams(), params}) {
        EXPECT_FALSE(tested.inOutPoints());
        EXPECT_FALSE(tested.filters());
        EXPECT_FALSE(tested.chapterPoints());
        EXPECT_FALSE(tested.audioChannelMap());
        EXPECT_FALSE(tested.getQualityStatsSetup());
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
}

TEST(MetaProcessParams, Defaults) {
    MetaProcessParams params;
    EXPECT_FALSE(params.doCc608() || params.doCc708() || params.valid608_1Fillers() ||
                 params.valid608_2Fillers());
    EXPECT_EQ(params.ccUserDataFmt(), -1);
    params.setCcMode(true, false, 3, false, true);
    EXPECT_TRUE(params.doCc608() && !params.doCc708() && !params.valid608_1Fillers() &&
                params.valid608_2Fillers());
    EXPECT_EQ(params.ccUserDataFmt(), 3);
}

}  // namespace
