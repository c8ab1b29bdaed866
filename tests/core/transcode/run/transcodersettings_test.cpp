#include "core/transcode/run/transcodersettings_p.h"

#include "core/engine/status.h"
#include "tests/support/checks.h"

namespace {

TEST(TranscoderSettings, WhatIsTakenAndWhatIsAnswered) {
    const struct {
        const char* name;
        Any value;
        Any answer;  // invalid: the name is not answered
    } rows[] = {
        {"twoPass", 1, 1},
        {"writeLogfile", 7, 1},
        {"startDelay", 10000, 10000},
        {"progress", AnyDict("frames", 5), AnyDict("frames", 5)},
        {"progress", 5, AnyDict()},
        {"connMatrix", AnyVector(1, 2), AnyVector(1, 2)},
        {"connMatrix", AnyDict(), AnyVector()},
        {"chapters", AnyVector(1, 2), Any()},
        {"effects", AnyDict("a", 1), Any()},
        {"audioEffects", AnyDict("a", 1), Any()},
        {"metaName", "name", Any()},
        {"closeEncoder", 0, Any()},
        {"smartRender", 1, Any()},
        {"getOut", 1, Any()},
        {"timecodeOffset", 1, Any()},
    };
    for (const auto& row : rows) {
        TranscoderSettings settings;
        EXPECT_EQ(settings.setParam(row.name, row.value), QvStatus::ok) << row.name;
        Any answer;
        settings.getParam(row.name, answer);
        EXPECT_EQ(answer, row.answer) << row.name;
    }
}

TEST(TranscoderSettings, ARefusedValueChangesNothing) {
    TranscoderSettings settings;
    for (const Any& value : {Any(-1), Any(10001), Any("soon")})
        EXPECT_EQ(settings.setParam("startDelay", value), QvStatus::invalidParam);
    EXPECT_EQ(settings.startDelay, 250);
    EXPECT_FALSE(settings.setParam("speed", 1).has_value());
    EXPECT_FALSE(settings.setParam(nullptr, 1).has_value());
}

TEST(TranscoderSettings, GlobalParametersComeWithAdvice) {
    const struct {
        const char *name, *what;
    } rows[] = {
        {"effects", "video 'effects'"},
        {"audioEffects", "'audioEffects'"},
        {"chapters", "'chapterPoints'"},
        {"connMatrix", "'connMatrix' parameter"},
    };
    for (const auto& row : rows) {
        LogCapture log;
        TranscoderSettings settings;
        settings.setParam(row.name, 5);
        EXPECT_TRUE(log.contains("Transcoder: Setting global " + std::string(row.what) +
                                 ", using ProcessParams is recommended."));
    }
}

}  // namespace
