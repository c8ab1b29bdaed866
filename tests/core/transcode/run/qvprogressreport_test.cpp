#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "core/transcode/run/qvprogressreport_p.h"

namespace {

// What is reported in 8 rounds of half a second each, as "round:percent".
std::string reported(const AnyDict& settings, int total, double offset = 0, double scale = 1) {
    QvProgressReport report(settings, total, 4.0);
    report.setPass(offset, scale);
    std::string all;
    for (int i = 0; i < 8; ++i) {
        double part = -1;
        if (!report.due(1000 + i * 0.5, part)) continue;
        all += (all.empty() ? "" : " ") + std::to_string(i) + ":" +
               std::to_string(static_cast<int>(part * 100 + 0.5));
    }
    return all;
}

TEST(QvProgressReport, EachKeyHasItsOwnPace) {
    const char* every = "0:0 1:13 2:25 3:38 4:50 5:63 6:75 7:88";
    const struct {
        AnyDict settings;
        int total;
        const char* expected;
    } rows[] = {
        {{}, 8, every},
        {{}, 400, "0:0 4:1"},
        {AnyDict("promile", 1), 4000, "0:0 4:0"},
        {AnyDict("frames", 3), 8, "0:0 3:38 6:75"},
        {AnyDict("frames", 1e300), 8, ""},
        {AnyDict("time", 1), 8, "0:0 4:50"},
        {AnyDict("time", 0.4), 8, "0:0 2:25 4:50 6:75"},
        {AnyDict("off", "whatever"), 8, ""},
        {AnyDict("absoluteTime", 1), 8, "0:13 2:38 4:63 6:88"},
    };
    for (const auto& row : rows)
        EXPECT_EQ(reported(row.settings, row.total), row.expected)
            << (row.settings.empty() ? "" : row.settings.getKey(0)) << " of " << row.total;
}

TEST(QvProgressReport, TwoPassesShareTheWhole) {
    const AnyDict frames("frames", 4);
    EXPECT_EQ(reported(frames, 8, 0, 0.5), "0:0 4:25");
    EXPECT_EQ(reported(frames, 8, 0.5, 0.5), "0:50 4:75");
}

}  // namespace
