#include "core/engine/qvthreadpool.h"

#include <gtest/gtest.h>

#include <atomic>
#include <climits>
#include <condition_variable>
#include <cstdlib>
#include <mutex>
#include <new>
#include <numeric>
#include <stdexcept>
#include <thread>
#include <vector>

#include "tests/support/platform_scope.h"

namespace {

TEST(ThreadPool, EachIndexRunsOnceForAnyCountAndWidth) {
    for (const int workers : {0, 1, 3, 8}) {
        QvThreadPool pool(workers);
        EXPECT_EQ(pool.width(), workers + 1);
        for (const int count : {-1, 0, 1, 2, 7, 1000}) {
            std::vector<std::atomic<int>> runs(static_cast<std::size_t>(std::max(count, 0)));
            pool.parallelFor(count, [&](int i) { ++runs[static_cast<std::size_t>(i)]; });
            for (const auto& run : runs) ASSERT_EQ(run, 1);
        }
    }
}

TEST(ThreadPool, PlainWritesAreVisibleToTheCaller) {
    QvThreadPool pool(3);
    std::vector<int> squares(500);
    for (int round = 0; round < 200; ++round) {
        pool.parallelFor(500, [&](int i) { squares[static_cast<std::size_t>(i)] = i * round; });
        for (int i = 0; i < 500; ++i) ASSERT_EQ(squares[static_cast<std::size_t>(i)], i * round);
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

TEST(ThreadPool, CallsInsideCallsEnd) {
    QvThreadPool pool(2);
    std::atomic<int> leaves{0};
    pool.parallelFor(
        5, [&](int) { pool.parallelFor(5, [&](int) { pool.parallelFor(5, [&](int) { ++leaves; }); }); });
    EXPECT_EQ(leaves, 125);
}

TEST(ThreadPool, SeveralThreadsShareOnePool) {
    QvThreadPool pool(2);
    std::atomic<long> sum{0};
    std::vector<std::thread> callers;
    for (int t = 0; t < 4; ++t)
        callers.emplace_back([&] {
            for (int round = 0; round < 300; ++round) pool.parallelFor(16, [&](int i) { sum += i; });
        });
    for (auto& caller : callers) caller.join();
    EXPECT_EQ(sum, 4L * 300 * 120);
}

TEST(ThreadPool, AnExceptionReachesTheCallerAndThePoolGoesOn) {
    QvThreadPool pool(2);
    for (int round = 0; round < 50; ++round) {
        std::atomic<int> begun{0};
        EXPECT_THROW(pool.parallelFor(100'000,
                                      [&](int i) {
                                          ++begun;
                                          if (i == 3) throw std::runtime_error("three");
                                      }),
                     std::runtime_error);
        EXPECT_LE(begun, 100'000);
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

TEST(ThreadPool, ConstTasksAndTheSharedPool) {
    std::atomic<int> runs{0};
    const auto task = [&runs](int) { ++runs; };
    qvThreadPool().parallelFor(9, task);
    EXPECT_EQ(runs, 9);
    EXPECT_GE(qvThreadPool().width(), 1);
}

}  // namespace
