// Stopping in the middle: the status says which signal, and nothing is left that looks whole.
#include <sched.h>
#include <sys/stat.h>

#include <algorithm>
#include <chrono>
#include <fstream>

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
    // Whether this signal is one of a set that the system shows of a process, as "SigBlk".
    static bool isIn(const char* set, pid_t process, int signal) {
        std::ifstream status("/proc/" + std::to_string(process) + "/status");
        for (std::string line; std::getline(status, line);)
            if (line.rfind(std::string(set) + ":", 0) == 0)
                return (std::stoull(line.substr(7), nullptr, 16) >> (signal - 1)) & 1;
        return false;
    }
    // Whether signals are handled and the main thread waits, as far as the system tells.
    static bool waits(pid_t process) {
        if (!isIn("SigBlk", process, SIGTERM)) return false;
        std::string where;
        std::ifstream stream("/proc/" + std::to_string(process) + "/wchan");
        std::getline(stream, where);
        for (const char* known : {"partner", "poll", "futex"})
            if (where.find(known) != std::string::npos) return true;
        return geteuid() != 0 && where == "0";
    }
    template <class Condition>
    static bool comes(Condition condition) {
        const auto last = std::chrono::steady_clock::now() + std::chrono::milliseconds(Process::kPatience);
        while (!condition())
            if (std::chrono::steady_clock::now() > last || sched_yield() != 0) return false;
        return true;
    }
    long long bytesOfAll() const {
        long long bytes = 0;
        for (const auto& name : listing()) bytes += std::max(size(name), 0LL);
        return bytes;
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
        EXPECT_THAT(o.err, testing::HasSubstr("\"stopped: a signal ended the job; no output was written\""));
        EXPECT_EQ(listing(), c.before);
    }
    EXPECT_EQ(contents("out.raw"), "precious");
}

// The standard error is full and nobody reads it: the stop after the first signal waits for it, the second
// for nothing.
TEST_F(Signal, TheSecondEndsAtOnce) {
    int full[2];
    ASSERT_EQ(pipe2(full, 0), 0);
    fcntl(full[1], F_SETFL, O_NONBLOCK);
    const std::string page(4096, '.');
    while (write(full[1], page.data(), page.size()) > 0) {
    }
    fcntl(full[1], F_SETFL, 0);
    // The thread sanitizer would report threads that still run, and wait for room to do so.
    const std::string line = "export TSAN_OPTIONS=\"$TSAN_OPTIONS report_thread_leaks=0\"; exec '" +
                             program() + "' transcode " + kEndless +
                             " -o out.raw --save-task t.xml --filter rawdump:filename=dump 2>&" +
                             std::to_string(full[1]);
    Process run({"sh", "-c", line}, here());
    // Before the job runs, the first signal is the end.
    ASSERT_TRUE(comes([&] { return bytesOfAll() > 1 << 20; }));
    for (int i = 0; i < 2; ++i) {
        run.signal(SIGINT);
        EXPECT_TRUE(comes([&] { return !isIn("ShdPnd", run.id(), SIGINT); }));
    }
    EXPECT_EQ(run.finish().status, 130);
    EXPECT_EQ(listing(), std::set<std::string>());
    close(full[0]);
    close(full[1]);
}

TEST_F(Signal, TheSecondEndsTheCommandOfPost) {
    Process run(words({"transcode", "testgen:size=64x64,duration=0.1,audio=0", "-o", "out.raw", "--post",
                       "trap '' INT; echo started; while :; do sleep 1; done"}),
                here());
    ASSERT_TRUE(run.waitFor("started"));
    run.signal(SIGINT);
    EXPECT_TRUE(comes([&] { return !isIn("ShdPnd", run.id(), SIGINT); }));
    run.signal(SIGINT);
    const Outcome o = run.finish();
    EXPECT_EQ(o.status, 130);
    EXPECT_THAT(
        o.err,
        testing::HasSubstr(
            "stopped in the command of --post: it got the signal and has ended; 'out.raw' is complete\n"));
}

// A pipe that nobody has opened, or that nobody reads, holds nothing up, whatever it is for.
TEST_F(Signal, TheFirstEndsTheWaitForAReader) {
    folder.write("t.srt", "1\n00:00:00,000 --> 00:00:01,000\nHello\n");
    std::filesystem::create_directory(folder.file("tmp"));
    const Words job{"transcode", "testgen:size=1280x720,rate=25,duration=2,audio=0", "-o", "out.raw", "-q"};
    const Words rows[] = {
        job + Words{"--filter", "rawdump:filename=pipe.raw"},
        job + Words{"--save-task", "pipe.raw"},
        {"captions", "t.srt", "--vtt", "-o", "pipe.raw"},
    };
    ProcessOptions options = here();
    options.environment = {"TMPDIR=" + folder.file("tmp")};
    for (const auto& row : rows)
        for (const bool opened : {false, true}) {
            // What fits into the pipe does not wait.
            if (opened && row.back().rfind("rawdump", 0) != 0) continue;
            SCOPED_TRACE(testing::PrintToString(row) + (opened ? " opened" : ""));
            const int reader = openPipe();
            if (!opened) close(reader);
            Process run(words(row), options);
            EXPECT_TRUE(opened ? hasData(reader) : comes([&] { return waits(run.id()); }));
            run.signal(SIGTERM);
            const Outcome o = run.finish();
            EXPECT_EQ(o.status, 143) << o.err;
            EXPECT_THAT(o.err, testing::HasSubstr("tarsel: stopped"));
            EXPECT_EQ(listing(), (std::set<std::string>{"pipe.raw", "t.srt", "tmp"}));
            if (opened) close(reader);
        }
}

TEST_F(Signal, AReaderThatGoesIsAnError) {
    const int reader = openPipe();
    Process run(intoPipe(), here());
    ASSERT_TRUE(hasData(reader));
    close(reader);
    const Outcome o = run.finish();
    EXPECT_EQ(o.status, 4);
    EXPECT_THAT(o.err, testing::AllOf(testing::HasSubstr("'pipe.raw'"),
                                      testing::HasSubstr("the reader has closed the pipe")));
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

TEST_F(Signal, OnRequestALineOfTheState) {
    Process run(words({"transcode", kEndless, "-o", "out.raw"}), here());
    const int reader = openPipe();
    Process held(words({"transcode", kLarge, "-o", "pipe.raw", "--progress", "json"}), here());
    ASSERT_TRUE(hasData(reader));
    ASSERT_TRUE(held.waitFor("\"event\":\"progress\"")) << "of its start";
    held.signal(SIGUSR1);  // its worker waits for the reader
    EXPECT_TRUE(held.waitFor("\"event\":\"progress\""));
    // Until its handler is there the program does what any does with this signal: wait for the folder of the
    // run.
    while (listing().size() < 2) sched_yield();
    for (int i = 0; i < 3; ++i) {
        run.signal(SIGUSR1);
        EXPECT_TRUE(run.waitFor("running\n"));
    }
    run.signal(SIGTERM);
    const Outcome o = run.finish();
    EXPECT_EQ(o.status, 143);
    EXPECT_THAT(o.err, testing::ContainsRegex("tarsel: +[0-9.]+ %  frame [0-9]+  [0-9.]+x.*  running\n"));
    close(reader);
}

TEST_F(Signal, OnRequestTheStateOfPost) {
    const Words job{"transcode",
                    "testgen:size=64x64,duration=0.1,audio=0",
                    "-o",
                    "out.raw",
                    "-y",
                    "--post",
                    "echo started; exec sleep 1000"};
    for (const bool json : {false, true}) {
        Process run(words(job + (json ? Words{"--progress", "json"} : Words{})), here());
        ASSERT_TRUE(run.waitFor("started"));
        run.signal(SIGUSR1);
        EXPECT_TRUE(run.waitFor(json ? "\"the command of --post is running\"}"
                                     : "tarsel: the command of --post is running\n"));
        run.signal(SIGTERM);
        EXPECT_EQ(run.finish().status, 143);
    }
}

TEST_F(Signal, ReachesTheCommandOfPost) {
    const Words job = {"transcode", "testgen:size=64x64,duration=0.1,audio=0", "-o", "out.raw", "-y",
                       "--post"};
    for (const int signal : {SIGTERM, SIGINT}) {
        // What the shell has started gets it too; the shell writes only after that has ended. The one that
        // writes "started" ends by the signal, whenever it comes.
        const std::string name = signal == SIGTERM ? "TERM" : "INT";
        Process run(words(job + Words{"trap 'echo got " + name + "' " + name +
                                      "; sh -c 'echo started; exec sleep 1000'; echo awake; exit 0"}),
                    here());
        ASSERT_TRUE(run.waitFor("started"));
        run.signal(signal);
        const Outcome o = run.finish();
        EXPECT_EQ(o.status, 128 + signal) << o.err;
        EXPECT_THAT(o.out, testing::HasSubstr("got " + name));
        EXPECT_THAT(o.err, testing::HasSubstr("'out.raw' is complete"));
        EXPECT_EQ(size("out.raw"), 2 * 64 * 64 * 4);
    }
}

// The file has its name and only the report is left, for which the full pipe has no room.
TEST_F(Signal, AfterTheResultHasItsNameChangesNothing) {
    int full[2];
    ASSERT_EQ(pipe2(full, O_NONBLOCK), 0);
    const std::string page(4096, '.');
    while (write(full[1], page.data(), page.size()) > 0) {
    }
    fcntl(full[1], F_SETFL, 0);
    // The thread sanitizer would report threads that still run, and wait for room to do so.
    const std::string line =
        "export TSAN_OPTIONS=\"$TSAN_OPTIONS report_thread_leaks=0\"; exec '" + program() +
        "' transcode testgen:size=64x64,duration=0.1,audio=0 -o out.raw 2>&" + std::to_string(full[1]);
    Process run({"sh", "-c", line}, here());
    while (size("out.raw") < 0) sched_yield();
    run.signal(SIGTERM);
    std::string reported;
    for (char block[4096]; reported.find("wrote 'out.raw'") == std::string::npos;) {
        pollfd data{full[0], POLLIN, 0};
        ASSERT_EQ(poll(&data, 1, Process::kPatience), 1);
        const ssize_t got = read(full[0], block, sizeof block);
        ASSERT_GT(got, 0);
        reported.append(block, static_cast<size_t>(got));
    }
    EXPECT_EQ(run.finish().status, 0);
    close(full[0]);
    close(full[1]);
}

// An input that becomes shorter under the run: what is read as silence or not at all is never passed off as
// content.
TEST_F(Signal, AnInputThatShrinksIsDamage) {
    const struct {
        Words job;
        std::string input, output;
        std::uintmax_t before, after, taken;  // bytes; of the output
    } rows[] = {
        {asYuv({"transcode", "in.yuv", "-o", "out.raw"}), "in.yuv", "out.raw", kFrame * 400000,
         kFrame * 10 + 5, kFrame * 10},
        {{"transcode", "in.wav", "-o", "out.wav"},
         "in.wav",
         "out.wav",
         44 + 1'600'000'000,
         44 + 4000,
         80 + 4000},
        {{"transcode", "--join", "in.wav", "in.wav", "-o", "out.wav"},
         "in.wav",
         "out.wav",
         44 + 1'600'000'000,
         44 + 4000,
         80 + 8000},
    };
    for (const auto& row : rows)
        for (const bool partial : {false, true}) {
            SCOPED_TRACE(row.input + (partial ? " --accept-partial" : ""));
            if (row.input == "in.wav")
                folder.write(row.input, riff(wavChunk("fmt ", wavFormat(1, 2, 48000, 16)) + "data" +
                                             std::string("\0\x10\x5E\x5F", 4)));
            else
                folder.write(row.input, "");
            std::filesystem::resize_file(folder.file(row.input), row.before);
            Process run(words(row.job + Words{"--progress", "json"} +
                              (partial ? Words{"--accept-partial"} : Words{})),
                        here());
            ASSERT_TRUE(run.waitFor("\"event\":\"progress\"")) << run.finish().err;
            run.signal(SIGSTOP);
            std::filesystem::resize_file(folder.file(row.input), row.after);
            run.signal(SIGCONT);
            const Outcome o = run.finish();
            EXPECT_EQ(o.status, partial ? 0 : 3) << o.err;
            EXPECT_THAT(o.err, testing::HasSubstr("became shorter while it was read"));
            std::set<std::string> expected{row.input};
            if (partial) {
                expected.insert(row.output);
                EXPECT_EQ(std::filesystem::file_size(folder.file(row.output)), row.taken);
            }
            EXPECT_EQ(listing(), expected);
            for (const auto& name : listing()) std::filesystem::remove_all(folder.file(name));
        }
}

}  // namespace
