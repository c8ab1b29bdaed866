#include "core/engine/threads/qvthreads.h"

#include "tests/support/checks.h"

namespace {

using namespace QVThreads;

TEST(Threads, ASectionIsRecursiveAndExcludesOthers) {
    QvCriticalSection section;
    int counter = 0;
    const auto count = [&] {
        for (int i = 0; i < 10'000; ++i) {
            const QvLock outer(&section);
            const QvLock inner(&section);
            ++counter;
        }
    };
    QvThread other;
    ASSERT_EQ(other.start(count), 0);
    count();
    other.wait();
    EXPECT_EQ(counter, 20'000);
}

TEST(Threads, AnEventHandsOverBothWaysAndPostsDoNotAddUp) {
    QvEvent ping, pong;
    EXPECT_FALSE(ping.wait(0));
    ping.post();
    ping.post();
    EXPECT_TRUE(ping.wait(0));
    EXPECT_FALSE(ping.wait(1));
    int value = 0;
    QvThread other;
    const auto answer = [&] {
        for (int i = 0; i < 1000; ++i) {
            ping.wait(-1);
            ++value;
            pong.post();
        }
    };
    ASSERT_EQ(other.start(answer), 0);
    for (int i = 0; i < 1000; ++i) {
        EXPECT_EQ(value, i);
        ping.post();
        EXPECT_TRUE(pong.wait(-1));
    }
}

TEST(Threads, ASemaphoreCounts) {
    QvSemaphore semaphore(1);
    semaphore.post(2);
    for (int i = 0; i < 3; ++i) EXPECT_TRUE(semaphore.wait(0));
    EXPECT_FALSE(semaphore.wait(0));
}

TEST(Threads, OneBodyAtATimeAndAgainAfterWaiting) {
    QvThread thread;
    QvEvent go;
    ASSERT_EQ(thread.start([&] { go.wait(-1); }), 0);
    EXPECT_EQ(thread.start([] {}), -1);
    go.post();
    thread.wait();
    thread.wait();
    bool ran = false;
    EXPECT_EQ(thread.start([&] { ran = true; }), 0);
    thread.wait();
    EXPECT_TRUE(ran);
    NoThreads none;
    const PlatformScope scope(none);
    EXPECT_EQ(thread.start([] { FAIL(); }), -1);
    thread.wait();
    EXPECT_FALSE(thread.started());
}

}  // namespace
