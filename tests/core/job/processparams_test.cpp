#include "core/job/processparams.h"

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
    points.setDuration(2, at(7));
    points.move(0, at(3));
    EXPECT_EQ(points.inPoint(), at(13));
    EXPECT_EQ(points.outPoint(), at(16)) << "moving loses the length";
}

TEST(ProcessParams, AnswersNothingForWhatIsAbsentOrOfAnotherType) {
    ProcessParams params;
    for (const char* key : {"inOutPoints", "filters", "chapters", "audioChannelMap", "smartRender",
                            "qualityStats", "audioConversion"})
        params.set(key, "text");
    for (const auto& tested : {ProcessParams(), params}) {
        EXPECT_FALSE(tested.inOutPoints() || tested.filters() || tested.chapterPoints() ||
                     tested.audioChannelMap() || tested.getQualityStatsSetup() || tested.audioConversion());
        EXPECT_EQ(tested.smartRender(), 0);
    }
}

TEST(ProcessParams, KeepWhatDiffersFromThePlainConversion) {
    ProcessParams params;
    params.setAudioConversion({});
    EXPECT_EQ(params.get("audioConversion"), Any(AnyDict()));
    AudioConversion conversion;
    conversion.rateQuality = "high";
    conversion.dither = "triangular";
    conversion.clipWarning = false;
    conversion.padEnd = true;
    params.setAudioConversion(conversion);
    EXPECT_EQ(params.audioConversion()->rateQuality, "high");
    EXPECT_EQ(params.audioConversion()->dither, "triangular");
    EXPECT_FALSE(params.audioConversion()->clipWarning);
    EXPECT_TRUE(params.audioConversion()->padEnd);
    params.set("audioConversion", AnyDict("rateQuality", 3));
    EXPECT_EQ(params.audioConversion()->rateQuality, "standard");
}

}  // namespace
