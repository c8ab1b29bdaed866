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

struct Counted {
    std::mutex lock;
    std::condition_variable changed;
    int runs = 0;
    bool closed = true;  // tasks wait

    void run() {
        std::unique_lock hold(lock);
        changed.wait(hold, [this] { return !closed; });
        ++runs;
        changed.notify_all();
    }
    void open() {
        const std::lock_guard hold(lock);
        closed = false;
        changed.notify_all();
    }
    void waitFor(int count) {
        std::unique_lock hold(lock);
        changed.wait(hold, [&] { return runs == count; });
    }
    static void call(void* counted) { static_cast<Counted*>(counted)->run(); }
};

// With its one worker busy the pool keeps tasks, and gives back those it is asked for, from any place of the
// list.
TEST(ThreadPool, TasksRunOnceUnlessTheyAreTakenBack) {
    for (const int taken : {0, 1, 2}) {
        Counted busy, counted;
        QvThreadPool pool(1);
        QvThreadPool::Task first(Counted::call, &busy), a(Counted::call, &counted),
            b(Counted::call, &counted), c(Counted::call, &counted);
        QvThreadPool::Task* const tasks[] = {&a, &b, &c};
        counted.open();
        EXPECT_TRUE(pool.start(first));
        while (pool.takeBack(first)) {  // until the worker has it
            pool.start(first);
            std::this_thread::yield();
        }
        for (auto* task : tasks) EXPECT_TRUE(pool.start(*task));
        EXPECT_TRUE(pool.takeBack(*tasks[taken]));
        EXPECT_FALSE(pool.takeBack(*tasks[taken]));
        EXPECT_FALSE(pool.takeBack(first)) << "it has begun";
        busy.open();
        counted.waitFor(2);
        EXPECT_TRUE(pool.start(*tasks[taken]));
        counted.waitFor(3);
    }
    NoThreads none;
    const PlatformScope scope(none);
    QvThreadPool alone(2);
    Counted counted;
    QvThreadPool::Task task(Counted::call, &counted);
    EXPECT_FALSE(alone.start(task));
    EXPECT_FALSE(alone.takeBack(task));
}

// A worker that a task keeps for long is not missed by parallelFor.
TEST(ThreadPool, PartsDoNotWaitForTasks) {
    Counted busy;
    QvThreadPool pool(1);
    QvThreadPool::Task task(Counted::call, &busy);
    ASSERT_TRUE(pool.start(task));
    std::atomic<int> runs{0};
    pool.parallelFor(10, [&](int) { ++runs; });
    EXPECT_EQ(runs, 10);
    busy.open();
    busy.waitFor(1);
}

}  // namespace
