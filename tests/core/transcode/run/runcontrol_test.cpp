#include "core/transcode/run/runcontrol_p.h"

#include <gtest/gtest.h>

#include "core/transcode/run/qvtranscoder.h"

namespace {

TEST(RunControl, AStopBetweenTwoRunsIsForTheNextOneWhereItIsAskedFor) {
    for (const bool next : {false, true}) {
        RunControl control;
        control.askForStop(next);
        control.begin();
        EXPECT_EQ(control.stopping(), next);
        control.end(QvTranscoder::connected);
        control.begin();
        EXPECT_FALSE(control.stopping()) << "the one after it";
        control.askForStop(next);
        control.end(QvTranscoder::connected);
        control.begin();
        EXPECT_FALSE(control.stopping()) << "the wish was for the run before";
    }
}

TEST(RunControl, ScopesNestAndKnowTheirRun) {
    RunControl outer, inner;
    EXPECT_FALSE(outer.onRunThread());
    const RunScope first(outer);
    {
        const RunScope second(inner);
        EXPECT_TRUE(outer.onRunThread() && inner.onRunThread());
    }
    EXPECT_TRUE(outer.onRunThread());
    EXPECT_FALSE(inner.onRunThread());
}

TEST(RunControl, APauseHoldsOnlyARunWithAWorker) {
    RunControl control;
    control.begin();
    control.pause();
    int reported = 0;
    control.waitWhilePaused([&](bool) { ++reported; });
    EXPECT_EQ(reported, 0) << "on the caller's own thread nobody could end it";
    control.synchronous = false;
    control.waitWhilePaused([&](bool paused) {
        ++reported;
        if (paused) control.resume();
    });
    EXPECT_EQ(reported, 2);
    control.pause();
    control.askForStop(false);
    EXPECT_FALSE(control.paused()) << "a stop ends it";
}

}  // namespace
