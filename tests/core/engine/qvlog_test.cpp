#include "core/engine/qvlog.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <stdlib.h>

#include <atomic>
#include <sstream>
#include <string>
#include <thread>
#include <vector>

#include "core/engine/qvexception.h"
#include "core/engine/qvfileutil.h"
#include "tests/support/log_capture.h"
#include "tests/support/temp_folder.h"

namespace {

using testing::HasSubstr;
using testing::MatchesRegex;

const std::string timeForm = "[0-9]+:[0-9]{2}:[0-9]{2}\\.[0-9]{3}";

std::vector<std::string> linesOf(const std::string& text) {
    std::vector<std::string> lines;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) lines.push_back(line);
    return lines;
}

// Leaves the log without targets and the environment without its variable.
class DbgLog : public testing::Test {
  protected:
    DbgLog() { ::unsetenv("QVTARSEL_DEBUG"); }
    ~DbgLog() override {
        ::unsetenv("QVTARSEL_DEBUG");
        qv_dbg()->init(nullptr, nullptr);
    }
    int open(const std::string& target) {
        const Any name(target.c_str());
        return qv_dbg()->init(&name, nullptr);
    }
    TempFolder folder_;
};

TEST_F(DbgLog, FileHoldsTagTimeAndText) {
    const std::string file = folder_.file("log.txt");
    ASSERT_EQ(open(file), 0);
    for (int mask : {1, 2, 4, 8, 16, 32, 64, 3}) qv_dbg()->log(mask, "level %d", mask);
    const auto lines = linesOf(TempFolder::read(file));
    ASSERT_EQ(lines.size(), 10u);
    const std::string tags[] = {"\\[CRT\\] ", "\\[ERR\\] ", "\\[WRN\\] ", "\\[INF\\] ",
                                " ",          "\\[DBG\\] ", "\\[PRG\\] ", " "};
    const int masks[] = {1, 2, 4, 8, 16, 32, 64, 3};
    for (std::size_t i = 0; i < 8; ++i) {
        EXPECT_THAT(lines[i + 2], MatchesRegex(tags[i] + timeForm + " level " + std::to_string(masks[i])));
    }
    EXPECT_THAT(lines[0], HasSubstr("Log file version 2.5.10.7839 2011-10-12 "));
    EXPECT_NE(lines[0].find(file), std::string::npos);
    EXPECT_NE(lines[1].find("Processors: "), std::string::npos);
}

TEST_F(DbgLog, TheSameTargetIsNotTruncated) {
    const std::string file = folder_.file("log.txt");
    open(file);
    qv_dbg()->info("first");
    EXPECT_EQ(open(file), 0);
    qv_dbg()->info("second");
    const std::string text = TempFolder::read(file);
    EXPECT_NE(text.find("first"), std::string::npos);
    EXPECT_NE(text.find("second"), std::string::npos);
}

TEST_F(DbgLog, AnotherTargetEndsTheFirst) {
    const std::string first = folder_.file("1");
    open(first);
    Any second(folder_.file("2").c_str());
    EXPECT_EQ(qv_dbg()->setLogfile(&second), 0);
    qv_dbg()->info("later");
    EXPECT_EQ(TempFolder::read(first).find("later"), std::string::npos);
    EXPECT_NE(TempFolder::read(folder_.file("2")).find("later"), std::string::npos);
    Any none;
    EXPECT_EQ(qv_dbg()->setLogfile(&none), 0);
    EXPECT_FALSE(qv_dbg()->hasTarget());
}

TEST_F(DbgLog, FileThatCannotOpenGoesToStandardError) {
    testing::internal::CaptureStderr();
    EXPECT_EQ(open(folder_.file("missing/log.txt")), -8);
    qv_dbg()->info("still here");
    const std::string text = testing::internal::GetCapturedStderr();
    EXPECT_NE(text.find("*** Failed to open logfile"), std::string::npos);
    EXPECT_NE(text.find("[INF]"), std::string::npos);
    EXPECT_NE(text.find("still here"), std::string::npos);
}

TEST_F(DbgLog, CommandsDoNotHoldTheLogFile) {
    const std::string file = folder_.file("held.txt");
    ASSERT_EQ(open(file), 0);
    EXPECT_NE(execute_process("ls -l /proc/self/fd | grep -q held.txt"), 0);
}

TEST_F(DbgLog, EnvironmentOverridesUnlessItBeginsWithZero) {
    ::setenv("QVTARSEL_DEBUG", "stderr", 1);
    testing::internal::CaptureStderr();
    open(folder_.file("unused"));
    qv_dbg()->info("to the standard error");
    EXPECT_NE(testing::internal::GetCapturedStderr().find("to the standard error"), std::string::npos);
    EXPECT_FALSE(std::filesystem::exists(folder_.file("unused")));
    for (const char* off : {"0", "0stderr", ""}) {
        ::setenv("QVTARSEL_DEBUG", off, 1);
        testing::internal::CaptureStdout();
        open("stdout");
        qv_dbg()->info("to the standard output");
        EXPECT_NE(testing::internal::GetCapturedStdout().find("to the standard output"), std::string::npos);
        qv_dbg()->init(nullptr, nullptr);
    }
}

TEST_F(DbgLog, LongLinesAreCut) {
    const std::string file = folder_.file("log.txt");
    open(file);
    qv_dbg()->logs(8, std::string(5000, 'x').c_str());
    EXPECT_EQ(linesOf(TempFolder::read(file)).back().size(), std::string("[INF] ").size() + 2047);
}

TEST_F(DbgLog, LoggerGetsTimeAndTextWithoutTag) {
    struct Receiver : QvLogBase {
        std::string last;
        int mask = 0;
        void logs(int level, const unsigned short* text) override {
            mask = level;
            last.clear();
            for (; *text; ++text) last += static_cast<char>(*text);
        }
    } receiver;
    qv_dbg()->setLogger(&receiver);
    EXPECT_EQ(qv_dbg()->logger(), &receiver);
    qv_dbg()->progress("%d%%", 50);
    EXPECT_EQ(receiver.mask, 64);
    EXPECT_THAT(receiver.last, MatchesRegex(timeForm + " 50%"));
    qv_dbg()->setLogger(nullptr);
    qv_dbg()->info("unheard");
    EXPECT_EQ(receiver.mask, 64);
}

TEST_F(DbgLog, LoggerThatThrowsLeavesTheLogUsable) {
    struct Thrower : QvLogBase {
        void logs(int, const unsigned short*) override { throw 1; }
    } thrower;
    qv_dbg()->setLogger(&thrower);
    EXPECT_THROW(qv_dbg()->info("x"), int);
    std::thread([] {
        qv_dbg()->setLogger(nullptr);
    }).join();  // would wait forever if the lock were still held
    EXPECT_NO_THROW(qv_dbg()->info("x"));
}

// Eight threads log while the file, the logger and the messages of users come and go.
TEST_F(DbgLog, ThreadsKeepLinesWhole) {
    constexpr int threads = 8;
    constexpr int messages = 200;
    const std::string file = folder_.file("log.txt");
    open(file);
    LogCapture capture;
    std::atomic<int> running{threads};
    std::vector<std::thread> pool;
    for (int t = 0; t < threads; ++t)
        pool.emplace_back([t, &running] {
            for (int i = 0; i < messages; ++i) {
                qv_dbg()->debug("thread %d line %d %s", t, i, std::string(100, 'x').c_str());
                qv_log()->info("user %d line %d", t, i);
            }
            --running;
        });
    while (running) {
        AnyVector all;
        qv_log()->getAll(all);
        qv_dbg()->setLogger(&capture);
        std::this_thread::yield();
    }
    for (auto& thread : pool) thread.join();
    const auto lines = linesOf(TempFolder::read(file));
    EXPECT_EQ(lines.size(), 2u + 2u * threads * messages);
    const auto whole = MatchesRegex("\\[(DBG|INF)\\] " + timeForm +
                                    " (thread [0-7] line [0-9]+ x{100}|user [0-7] line [0-9]+)");
    for (std::size_t i = 2; i < lines.size(); ++i) ASSERT_THAT(lines[i], whole);
    EXPECT_EQ(capture.count(" line "), 2 * threads * messages);
    qv_log()->clear();
}

std::vector<std::string> textsOf(const AnyVector& messages) {
    std::vector<std::string> texts;
    for (const Any& message : messages) texts.push_back(message.asDict().getString("text", ""));
    return texts;
}

TEST(LogBuffer, HoldsOneMoreThanItsMaximumAndCountsAll) {
    QvLogBuffer buffer;
    buffer.setMaxMessages(2);
    for (int i = 0; i < 5; ++i) buffer.error("e%d", i);
    EXPECT_EQ(buffer.nrMessages(), 3);
    EXPECT_EQ(buffer.nrErrors(), 5);
    AnyVector all;
    EXPECT_EQ(buffer.getAll(all), 3);
    EXPECT_EQ(textsOf(all), (std::vector<std::string>{"e2", "e3", "e4"}));
    EXPECT_EQ(all.at(0).asDict().getInt32("type"), 2);
    buffer.logs(2, static_cast<const char*>(nullptr));
    EXPECT_EQ(buffer.nrMessages(), 2);
    EXPECT_EQ(buffer.nrErrors(), 5);
}

TEST(LogBuffer, LevelsOfItsOperations) {
    QvLogBuffer buffer;
    buffer.log(1, "m");
    buffer.error("m");
    buffer.warning("m");
    buffer.info("m");
    buffer.header("m");
    buffer.progress("m");
    buffer.fappend("m");
    buffer.append("m", 4);
    buffer.append(Any(u"m"), 2);
    buffer.append(Any(1), 2);
    AnyVector all;
    ASSERT_EQ(buffer.getAll(all), 9);
    const int masks[] = {1, 2, 4, 8, 16, 64, 8, 4, 2};
    for (int i = 0; i < 9; ++i) {
        EXPECT_EQ(all.at(i).asDict().getInt32("type"), masks[i]);
        EXPECT_STREQ(all.at(i).asDict().getString("text"), "m");
    }
    EXPECT_EQ(buffer.nrErrors(), 2);
    EXPECT_EQ(buffer.nrWarnings(), 2);
    buffer.clearStatus();
    EXPECT_EQ(buffer.nrErrors() + buffer.nrWarnings(), 0);
    EXPECT_EQ(buffer.nrMessages(), 9);
}

TEST(LogBuffer, PollerGetsWhatIsNewAndAtLeastTheLast) {
    QvLogBuffer buffer;
    AnyVector out(Any(1));
    EXPECT_EQ(buffer.getAll(out), -1);
    EXPECT_TRUE(out.empty());
    EXPECT_EQ(buffer.getSince(out, -1), -1);
    for (const char* text : {"a", "b", "c"}) buffer.append(text, 8);
    const struct {
        int last;
        std::vector<std::string> texts;
    } cases[] = {
        {-1, {"a", "b", "c"}}, {0, {"b", "c"}},          {1, {"c"}}, {2, {"c"}}, {1000, {"c"}},
        {2147483647, {"c"}},   {-1000, {"a", "b", "c"}},
    };
    for (const auto& c : cases) {
        EXPECT_EQ(buffer.getSince(out, c.last), 3);
        EXPECT_EQ(textsOf(out), c.texts) << c.last;
    }
}

TEST(LogBuffer, WriteCounterMovesWithMessagesAndClear) {
    QvLogBuffer buffer;
    const int start = buffer.getWriteCntr();
    buffer.info("x");
    buffer.logs(8, static_cast<const char*>(nullptr));
    buffer.clear();
    EXPECT_EQ(buffer.getWriteCntr(), start + 3);
    EXPECT_EQ(buffer.nrMessages(), 0);
}

TEST(LogBuffer, CopyFileTakesMessagesUntilItIsClosed) {
    const TempFolder folder;
    QvLogBuffer buffer;
    EXPECT_EQ(buffer.setLogFile(Any(folder.file("missing/x").c_str())), -1);
    EXPECT_EQ(buffer.setLogFile(Any(folder.file("copy").c_str())), 0);
    buffer.error("100%%");
    buffer.append("50% of %s", 8);
    EXPECT_EQ(buffer.setLogFile(Any()), -1);
    buffer.info("later");
    EXPECT_THROW(buffer.setLogFile(Any(1)), QvAssertFailure);
    EXPECT_NO_THROW(buffer.info("latest"));
    EXPECT_EQ(TempFolder::read(folder.file("copy")), "100%\n50% of %s\n");
}

TEST(LogBuffer, PercentSignsReachTheDebugLogWithoutHarm) {
    LogCapture log;
    QvLogBuffer buffer;
    buffer.append("100%% done", 8);
    buffer.append("%s%n%d %5.2f %", 4);
    buffer.append("a %%%% b%%", 8);
    EXPECT_EQ(log.texts(), (std::vector<std::string>{"100% done", "%s%n%d %5.2f %", "a %% b%"}));
    EXPECT_EQ(log.lines()[1].mask, 4);
}

}  // namespace
