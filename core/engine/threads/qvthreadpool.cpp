#include "core/engine/threads/qvthreadpool.h"

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <exception>
#include <mutex>
#include <vector>

#include "core/arch/platform.h"

namespace {

constexpr int turnsBeforeSleep = 200;

}  // namespace

// One parallelFor. It lives on the stack of its caller, which waits for every helper before it returns.
struct QvThreadPool::Job {
    Job(Call function, void* data, int parts) : call(function), context(data), count(parts) {}

    const Call call;
    void* const context;
    const int count;
    std::atomic<long long> next{0};  // every thread that finds no more adds one: wider than the count
    std::atomic<int> helpers{0};     // workers inside; changed under the pool's lock
    std::exception_ptr failed;       // guarded by the pool's lock
    std::condition_variable done;
    Job* below = nullptr;  // the list of open jobs, newest first

    bool hasWork() const { return next.load(std::memory_order_relaxed) < count; }
};

struct QvThreadPool::State {
    std::mutex lock;
    std::condition_variable wake;
    Job* open = nullptr;
    Task* firstTask = nullptr;  // those that wait for a worker
    Task** lastTask = &firstTask;
    bool stopping = false;
    int idle = 0;
    std::vector<std::thread> workers;

    void work(Job& job);
    void workerLoop();
    Job* findJob() const;
    void close(Job& job);
    void add(Task& task);
    bool remove(Task& task);
};

// Newest first: a job inside a job is what its caller, itself a worker, waits for.
QvThreadPool::Job* QvThreadPool::State::findJob() const {
    Job* job = open;
    while (job && !job->hasWork()) job = job->below;
    return job;
}

void QvThreadPool::State::work(Job& job) {
    try {
        for (long long i; (i = job.next.fetch_add(1, std::memory_order_relaxed)) < job.count;)
            job.call(job.context, static_cast<int>(i));
    } catch (...) {
        const std::lock_guard hold(lock);
        if (!job.failed) job.failed = std::current_exception();
        job.next.store(job.count, std::memory_order_relaxed);
    }
}

void QvThreadPool::State::workerLoop() {
    std::unique_lock hold(lock);
    while (true) {
        Job* const job = findJob();
        if (Task* const task = job ? nullptr : firstTask) {
            remove(*task);
            hold.unlock();
            task->call_(task->context_);
            hold.lock();
            continue;
        }
        if (!job) {
            if (stopping) return;
            ++idle;
            wake.wait(hold);
            --idle;
            continue;
        }
        ++job->helpers;
        hold.unlock();
        work(*job);
        hold.lock();
        if (--job->helpers == 0) job->done.notify_one();
    }
}

void QvThreadPool::State::close(Job& job) {
    Job** link = &open;
    while (*link != &job) link = &(*link)->below;
    *link = job.below;
}

void QvThreadPool::State::add(Task& task) {
    task.next_ = nullptr;
    task.waiting_ = true;
    *lastTask = &task;
    lastTask = &task.next_;
}

bool QvThreadPool::State::remove(Task& task) {
    if (!task.waiting_) return false;
    Task** link = &firstTask;
    while (*link != &task) link = &(*link)->next_;
    *link = task.next_;
    if (lastTask == &task.next_) lastTask = link;
    task.waiting_ = false;
    return true;
}

QvThreadPool::QvThreadPool(int workers) : state_(std::make_unique<State>()) {
    State* const state = state_.get();
    state->workers.reserve(static_cast<std::size_t>(std::max(workers, 0)));  // one that runs can't be dropped
    for (int i = 0; i < workers; ++i) {
        std::thread worker = qv_platform().startThread([state] { state->workerLoop(); });
        if (!worker.joinable()) break;
        state->workers.push_back(std::move(worker));
    }
}

QvThreadPool::~QvThreadPool() {
    {
        const std::lock_guard hold(state_->lock);
        state_->stopping = true;
    }
    state_->wake.notify_all();
    for (std::thread& worker : state_->workers) worker.join();
}

int QvThreadPool::width() const { return static_cast<int>(state_->workers.size()) + 1; }

void QvThreadPool::run(int count, Call call, void* context) {
    if (count <= 0) return;
    if (count == 1 || state_->workers.empty()) {
        for (int i = 0; i < count; ++i) call(context, i);
        return;
    }
    Job job(call, context, count);
    std::unique_lock hold(state_->lock);
    job.below = state_->open;
    state_->open = &job;
    const int wanted = std::min(count - 1, state_->idle);
    hold.unlock();
    for (int i = 0; i < wanted; ++i) state_->wake.notify_one();

    state_->work(job);

    // Helpers are at their last part, which ends sooner, as a rule, than a sleeping thread wakes.
    for (int turn = 0; turn < turnsBeforeSleep && job.helpers.load(std::memory_order_relaxed) > 0; ++turn)
        std::this_thread::yield();
    hold.lock();
    state_->close(job);
    job.done.wait(hold, [&job] { return job.helpers == 0; });
    hold.unlock();
    if (job.failed) std::rethrow_exception(job.failed);
}

namespace {

std::mutex g_settingLock;
int g_threads = 0;  // as it was set; guarded by g_settingLock, as is the next
bool g_made = false;

int workersOfThePool() {
    const std::lock_guard hold(g_settingLock);
    g_made = true;
    return (g_threads > 0 ? g_threads : qv_platform().processors()) - 1;
}

}  // namespace

bool qvSetThreads(int threads) {
    const std::lock_guard hold(g_settingLock);
    if (threads < 0 || threads > kQvMostThreads || g_made) return false;
    g_threads = threads;
    return true;
}

bool QvThreadPool::start(Task& task) {
    if (state_->workers.empty()) return false;
    {
        const std::lock_guard hold(state_->lock);
        state_->add(task);
    }
    state_->wake.notify_one();
    return true;
}

bool QvThreadPool::takeBack(Task& task) {
    const std::lock_guard hold(state_->lock);
    return state_->remove(task);
}

QvThreadPool& qvThreadPool() {
    static QvThreadPool pool(workersOfThePool());
    return pool;
}
