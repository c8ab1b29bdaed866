// What is seen on a terminal, and the keys that work there.
#include "tests/system/tool.h"

namespace {

using testing::HasSubstr;

class Terminal : public Tool {
  protected:
    Terminal() { screen.terminal = true; }
    ProcessOptions screen = here();
};

TEST_F(Terminal, KeysPauseResumeAndStop) {
    const struct {
        const char* stop;
        Words job;
    } cases[] = {
        {"q", {"transcode", "testgen:size=64x64,duration=20000,audio=0", "-o", "out.raw"}},
        {"\x03", {"transcode", "testgen:size=64x64,duration=20000,audio=0", "-o", "out.raw"}},
        // while the sound of a join is measured
        {"q",
         {"transcode", "--join", "testgen:size=64x64,duration=20000", "testgen:size=64x64,duration=20000",
          "--normalize", "-o", "out.raw"}},
    };
    for (const auto& [stop, job] : cases) {
        Process run(words(job), screen);
        ASSERT_TRUE(run.waitFor("keys: p q ?"));
        run.type("?");
        ASSERT_TRUE(run.waitFor("p pauses and resumes, q stops the job"));
        run.type("p");
        ASSERT_TRUE(run.waitFor("paused (p resumes, q stops)"));
        run.type("p");
        ASSERT_TRUE(run.waitFor("keys: p q ?"));
        run.type("p");
        ASSERT_TRUE(run.waitFor("paused"));
        run.type(stop);
        const Outcome o = run.finish();
        EXPECT_EQ(o.status, 130);
        EXPECT_THAT(o.out, HasSubstr("stopped: a signal ended the job; no output was written"));
        EXPECT_EQ(listing(), std::set<std::string>());
    }
}

TEST_F(Terminal, TheLineGoesWithASignal) {
    Process run(words({"frame", "testgen:size=64x64,duration=20000,audio=0", "--rate", "50", "--at=-1f", "-o",
                       "x.png"}),
                screen);
    ASSERT_TRUE(run.waitFor("left"));
    run.signal(SIGTERM);
    const Outcome o = run.finish();
    EXPECT_EQ(o.status, 143);
    EXPECT_THAT(o.out, HasSubstr("\r\x1b[Ktarsel: stopped: a signal ended the command"));
    EXPECT_THAT(o.out, testing::Not(HasSubstr("keys:"))) << "it has none";
}

TEST_F(Terminal, OneLineThatGoes) {
    const Outcome o = tarsel({"transcode", "testgen:size=64x64,duration=2", "-o", "out.raw"}, screen);
    EXPECT_EQ(o.status, 0);
    EXPECT_EQ(std::count(o.out.begin(), o.out.end(), '\n'), 1) << o.out;
    EXPECT_THAT(o.out, HasSubstr("task 1 of 1"));
    EXPECT_THAT(o.out, HasSubstr("\r\x1b[Ktarsel: wrote 'out.raw'"));
}

}  // namespace
