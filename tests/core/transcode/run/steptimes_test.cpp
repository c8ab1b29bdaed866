#include "core/transcode/run/steptimes_p.h"

#include <gtest/gtest.h>

namespace {

TEST(StepTimes, StuckIsLongerThanAMinuteAndThanFiveOfTheLongestSteps) {
    const struct {
        double longest, idle;  // seconds
        bool stuck;
    } rows[] = {{1, 59, false}, {1, 60, false}, {1, 61, true}, {20, 99, false}, {20, 101, true}};
    for (const auto& row : rows) {
        StepTimes times;
        times.begin(1000);
        times.step(1000 + row.longest);
        times.step(1000 + row.longest + 0.5);
        EXPECT_EQ(times.stuck(1000.5 + row.longest + row.idle), row.stuck) << row.longest << " " << row.idle;
        times.begin(0);  // a run that has not come to its loop
        EXPECT_FALSE(times.stuck(5000));
    }
}

}  // namespace
