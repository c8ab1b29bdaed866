#include "core/engine/threads/qvthreadpool.h"

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <stdexcept>
#include <thread>

#include "tests/support/checks.h"

namespace {

// Plain writes, which the caller must see.
TEST(ThreadPool, EachIndexRunsOnceForAnyCountAndWidth) {
    for (const int workers : {0, 1, 3, 8}) {
        QvThreadPool pool(workers);
        EXPECT_EQ(pool.width(), workers + 1);
        for (const int count : {-1, 0, 1, 2, 7, 1000, 1000, 1000}) {
            std::vector<int> runs(static_cast<std::size_t>(std::max(count, 0)));
            pool.parallelFor(count, [&](int i) { ++runs[static_cast<std::size_t>(i)]; });
            for (const int run : runs) ASSERT_EQ(run, 1);
        }
    }
}

// Both parts must be under way at once for either to end.
TEST(ThreadPool, WorkIsReallyShared) {
    QvThreadPool pool(1);
    std::mutex lock;
    std::condition_variable met;
    int here = 0;
    pool.parallelFor(2, [&](int) {
        std::unique_lock hold(lock);
        ++here;
        met.notify_all();
        met.wait(hold, [&] { return here == 2; });
    });
    EXPECT_EQ(here, 2);
}

TEST(ThreadPool, SeveralThreadsShareOnePoolWithCallsInsideCalls) {
    QvThreadPool pool(2);
    std::atomic<long> sum{0};
    std::vector<std::thread> callers;
    for (int t = 0; t < 4; ++t)
        callers.emplace_back([&] {
            for (int round = 0; round < 100; ++round)
                pool.parallelFor(4, [&](int) { pool.parallelFor(16, [&](int i) { sum += i; }); });
        });
    for (auto& caller : callers) caller.join();
    EXPECT_EQ(sum, 4L * 100 * 4 * 120);
}

TEST(ThreadPool, AnExceptionReachesTheCallerAndThePoolGoesOn) {
    QvThreadPool pool(2);
    for (int round = 0; round < 50; ++round) {
        const auto fail = [](int i) {
            if (i == 3) throw std::runtime_error("three");
        };
        EXPECT_THROW(pool.parallelFor(100'000, fail), std::runtime_error);
        std::atomic<int> runs{0};
        pool.parallelFor(10, [&](int) { ++runs; });
        EXPECT_EQ(runs, 10);
    }
}

TEST(ThreadPool, WorksWithTheThreadsThatThereAre) {
    NoThreads two(2), none;
    for (QvPlatform* platform : {static_cast<QvPlatform*>(&two), static_cast<QvPlatform*>(&none)}) {
        const PlatformScope scope(*platform);
        QvThreadPool pool(5);
        EXPECT_EQ(pool.width(), platform == &two ? 3 : 1);
        std::atomic<int> runs{0};
        pool.parallelFor(50, [&](int) { ++runs; });
        EXPECT_EQ(runs, 50);
    }
}

// How many threads a setting brings, whole runs of the tool show.
TEST(ThreadPool, TheNumberIsSetBeforeThePoolIsThere) {
    EXPECT_FALSE(qvSetThreads(-1));
    EXPECT_FALSE(qvSetThreads(kQvMostThreads + 1));
    EXPECT_GE(qvThreadPool().width(), 1);
    EXPECT_FALSE(qvSetThreads(2));
}

}  // namespace
