#include "core/engine/log/qvlog.h"

#include <gmock/gmock.h>
#include <stdlib.h>

#include <atomic>
#include <sstream>
#include <thread>

#include "core/engine/files/qvfileutil.h"
#include "tests/support/checks.h"

namespace {

using testing::HasSubstr;
using testing::MatchesRegex;

const std::string timeForm = "[0-9]+:[0-9]{2}:[0-9]{2}\\.[0-9]{3}";

Texts linesOf(const std::string& text) {
    Texts lines;
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
    const struct {
        int mask;
        const char* tag;
    } levels[] = {{1, "\\[CRT\\]"}, {2, "\\[ERR\\]"},  {4, "\\[WRN\\]"},  {8, "\\[INF\\]"},
                  {16, ""},         {32, "\\[DBG\\]"}, {64, "\\[PRG\\]"}, {3, ""}};
    for (const auto& level : levels) qv_dbg()->log(level.mask, "level %d", level.mask);
    qv_dbg()->logs(8, std::string(5000, 'x').c_str());
    const auto lines = linesOf(TempFolder::read(file));
    ASSERT_EQ(lines.size(), 11u);
    EXPECT_EQ(lines[10].size(), std::string("[INF] ").size() + 2047);
    for (std::size_t i = 0; i < 8; ++i) {
        const std::string level = " level " + std::to_string(levels[i].mask);
        EXPECT_THAT(lines[i + 2], MatchesRegex(levels[i].tag + (" " + timeForm) + level));
    }
    EXPECT_THAT(lines[0], HasSubstr("Log file version 2.5.10.7839 2011-10-12 "));
    EXPECT_THAT(lines[0], HasSubstr(file));
    EXPECT_THAT(lines[1], HasSubstr("Processors: "));
}

TEST_F(DbgLog, TheSameTargetIsNotTruncatedAndAnotherEndsIt) {
    const std::string first = folder_.file("1");
    Any second(folder_.file("2").c_str()), none;
    open(first);
    qv_dbg()->info("one");
    EXPECT_EQ(open(first), 0);
    qv_dbg()->info("two");
    EXPECT_EQ(qv_dbg()->setLogfile(&second), 0);
    qv_dbg()->info("three");
    EXPECT_THAT(TempFolder::read(first), AllOf(HasSubstr("one"), HasSubstr("two"), Not(HasSubstr("three"))));
    EXPECT_THAT(TempFolder::read(folder_.file("2")), HasSubstr("three"));
    EXPECT_EQ(qv_dbg()->setLogfile(&none), 0);
    EXPECT_FALSE(qv_dbg()->hasTarget());
}

TEST_F(DbgLog, FileThatCannotOpenGoesToStandardError) {
    testing::internal::CaptureStderr();
    EXPECT_EQ(open(folder_.file("missing/log.txt")), -8);
    qv_dbg()->info("still here");
    EXPECT_THAT(testing::internal::GetCapturedStderr(),
                AllOf(HasSubstr("*** Failed to open logfile"), HasSubstr("[INF]"), HasSubstr("still here")));
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
    EXPECT_THAT(testing::internal::GetCapturedStderr(), HasSubstr("to the standard error"));
    EXPECT_FALSE(std::filesystem::exists(folder_.file("unused")));
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

Texts textsOf(const AnyVector& messages) {
    Texts texts;
    for (const Any& message : messages) texts.push_back(message.asDict().getString("text", ""));
    return texts;
}

TEST(LogBuffer, HoldsOneMoreThanItsMaximumAndCountsAll) {
    QvLogBuffer buffer;
    buffer.setMaxMessages(2);
    for (int i = 0; i < 5; ++i) buffer.error("e%d", i);
    AnyVector all;
    EXPECT_TRUE(buffer.nrMessages() == 3 && buffer.nrErrors() == 5 && buffer.getAll(all) == 3);
    EXPECT_EQ(textsOf(all), (Texts{"e2", "e3", "e4"}));
    const int start = buffer.getWriteCntr();
    buffer.logs(2, static_cast<const char*>(nullptr));
    EXPECT_TRUE(buffer.nrMessages() == 2 && buffer.nrErrors() == 5);
    buffer.clear();
    EXPECT_TRUE(buffer.getWriteCntr() == start + 2 && buffer.nrMessages() == 0);
}

TEST(LogBuffer, PollerGetsWhatIsNewAndAtLeastTheLast) {
    QvLogBuffer buffer;
    AnyVector out(Any(1));
    EXPECT_TRUE(buffer.getAll(out) == -1 && buffer.getSince(out, -1) == -1 && out.empty());
    for (const char* text : {"a", "b", "c"}) buffer.append(text, 8);
    const struct {
        int last;
        Texts texts;
    } cases[] = {{-1, {"a", "b", "c"}}, {0, {"b", "c"}},         {1, {"c"}}, {2, {"c"}},
                 {2147483647, {"c"}},   {-1000, {"a", "b", "c"}}};
    for (const auto& c : cases) {
        EXPECT_EQ(buffer.getSince(out, c.last), 3);
        EXPECT_EQ(textsOf(out), c.texts) << c.last;
    }
}

TEST(LogBuffer, PercentSignsReachTheDebugLogWithoutHarm) {
    LogCapture log;
    QvLogBuffer buffer;
    buffer.append("100%% done", 8);
    buffer.append("%s%n%d %5.2f %", 4);
    buffer.append("a %%%% b%%", 8);
    qv_dbg()->progress("%d%%", 50);
    EXPECT_EQ(log.texts(), (Texts{"100% done", "%s%n%d %5.2f %", "a %% b%", "50%"}));
    EXPECT_EQ(log.lines()[1].mask, 4);
}

}  // namespace
