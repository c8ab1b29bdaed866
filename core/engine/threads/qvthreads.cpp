#include "core/engine/threads/qvthreads.h"

#include <chrono>
#include <condition_variable>
#include <mutex>

#include "core/arch/platform.h"
#include "core/engine/qvutil.h"

namespace {

// A count with a lock; what both the event and the semaphore are.
struct Counted {
    std::mutex lock;
    std::condition_variable changed;
    int count = 0;

    bool take(int milliseconds) {
        std::unique_lock hold(lock);
        const auto ready = [this] { return count > 0; };
        if (milliseconds < 0)
            changed.wait(hold, ready);
        else if (!changed.wait_for(hold, std::chrono::milliseconds(milliseconds), ready))
            return false;
        --count;
        return true;
    }
};

}  // namespace

namespace QVThreads {

struct QvCriticalSection::Lock {
    std::recursive_mutex mutex;
};

QvCriticalSection::QvCriticalSection() : lock_(std::make_unique<Lock>()) {}
QvCriticalSection::~QvCriticalSection() = default;
void QvCriticalSection::enter() { lock_->mutex.lock(); }
void QvCriticalSection::leave() { lock_->mutex.unlock(); }

struct QvEvent::State : Counted {};

QvEvent::QvEvent() : state_(std::make_unique<State>()) {}
QvEvent::~QvEvent() = default;

bool QvEvent::wait(int milliseconds) { return state_->take(milliseconds); }

// Notifies inside the lock: a waiter may destroy the event as soon as it has it.
void QvEvent::post() {
    const std::lock_guard hold(state_->lock);
    state_->count = 1;
    state_->changed.notify_one();
}

struct QvSemaphore::State : Counted {};

QvSemaphore::QvSemaphore(int initial) : state_(std::make_unique<State>()) { state_->count = initial; }
QvSemaphore::~QvSemaphore() = default;

bool QvSemaphore::wait(int milliseconds) { return state_->take(milliseconds); }

void QvSemaphore::post(int count) {
    const std::lock_guard hold(state_->lock);
    state_->count += count;
    if (count == 1)
        state_->changed.notify_one();
    else
        state_->changed.notify_all();
}

QvThread::QvThread() = default;
QvThread::~QvThread() { wait(); }

int QvThread::start(std::function<void()> body) {
    if (thread_.joinable()) return -1;
    thread_ = qv_platform().startThread(std::move(body));
    return thread_.joinable() ? 0 : -1;
}

void QvThread::wait() {
    if (thread_.joinable()) thread_.join();
}

QvLowPriority::QvLowPriority() : former_(qv_platform().lowerThreadPriority()) {}
QvLowPriority::~QvLowPriority() { qv_platform().restoreThreadPriority(former_); }

void sleep(int milliseconds) { qv_platform().sleep(milliseconds); }
int processors() { return qv_platform().processors(); }

}  // namespace QVThreads

void QvUtil::sleep(int milliseconds) { QVThreads::sleep(milliseconds); }
