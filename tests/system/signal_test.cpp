// Stopping in the middle: the status says which signal, and nothing is left that looks whole.
#include <sys/stat.h>

#include "tests/system/tool.h"

namespace {

class Signal : public Tool {
  protected:
    // Long enough that only a signal ends it.
    static constexpr const char* kEndless = "testgen:size=64x64,rate=25,duration=20000,audio=0";
    // The same with frames that no pipe holds: a reader that takes none of it holds the job up for sure.
    static constexpr const char* kLarge = "testgen:size=1280x720,rate=25,duration=20000,audio=0";
    // Returns the reading end of a pipe that is the output.
    int openPipe() const {
        mkfifo(folder.file("pipe.raw").c_str(), 0600);
        return open(folder.file("pipe.raw").c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    }
    static bool hasData(int reader) {
        pollfd data{reader, POLLIN, 0};
        return poll(&data, 1, Process::kPatience) == 1;
    }
    static Words intoPipe() { return words({"transcode", kLarge, "-o", "pipe.raw", "--progress", "json"}); }
    static Words endless() { return words({"transcode", kEndless, "-o", "out.raw", "--progress", "json"}); }
};

TEST_F(Signal, StopsAndLeavesWhatWasThere) {
    const struct {
        int signal, status;
        std::set<std::string> before;
    } cases[] = {{SIGINT, 130, {}}, {SIGTERM, 143, {}}, {SIGHUP, 129, {"out.raw"}}};
    for (const auto& c : cases) {
        for (const auto& name : c.before) folder.write(name, "precious");
        Process run(endless() + Words{"-y", "--filter", "rawdump:filename=dump"}, here());
        ASSERT_TRUE(run.waitFor("\"event\":\"progress\""));
        run.signal(c.signal);
        const Outcome o = run.finish();
        EXPECT_EQ(o.status, c.status) << o.err;
        EXPECT_THAT(o.err, testing::HasSubstr("\"event\":\"end\""));
        EXPECT_THAT(o.err, testing::HasSubstr("\"state\":\"stopped\""));
        EXPECT_THAT(o.err, testing::HasSubstr("tarsel: stopped; nothing was left behind\n"));
        EXPECT_EQ(listing(), c.before);
    }
    EXPECT_EQ(contents("out.raw"), "precious");
}

TEST_F(Signal, TheSecondEndsAtOnce) {
    const int reader = openPipe();
    Process run(intoPipe(), here());
    ASSERT_TRUE(run.waitFor("\"event\":\"start\""));
    char byte;
    ASSERT_TRUE(hasData(reader));
    ASSERT_EQ(read(reader, &byte, 1), 1);
    run.signal(SIGINT);
    ASSERT_TRUE(run.waitFor("tarsel: stopping"));
    run.signal(SIGINT);
    EXPECT_EQ(run.finish().status, 130);
    EXPECT_EQ(listing(), std::set<std::string>{"pipe.raw"});
    close(reader);
}

TEST_F(Signal, AReaderThatGoesIsAnError) {
    const int reader = openPipe();
    Process run(intoPipe(), here());
    ASSERT_TRUE(hasData(reader));
    close(reader);
    const Outcome o = run.finish();
    EXPECT_EQ(o.status, 4);
    EXPECT_THAT(o.err, testing::AllOf(testing::HasSubstr("'pipe.raw'"), testing::HasSubstr("Broken pipe")));
}

TEST_F(Signal, WhatIsIgnoredStaysIgnored) {
    ProcessOptions nohup = here();
    nohup.ignoreHangup = true;
    Process run(endless(), nohup);
    ASSERT_TRUE(run.waitFor("\"event\":\"progress\""));
    run.signal(SIGHUP);
    ASSERT_TRUE(run.waitFor("\"event\":\"progress\""));
    run.signal(SIGTERM);
    EXPECT_EQ(run.finish().status, 143);
}

}  // namespace
