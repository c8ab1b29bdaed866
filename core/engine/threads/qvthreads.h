// Thread primitives: a recursive lock, its scope guard, an auto-reset event, a semaphore and a worker thread.
#pragma once

#include <functional>
#include <memory>
#include <thread>

#include "core/arch/api.h"

namespace QVThreads {

// A thread may enter again what it holds, and leaves as often as it entered.
class QV_API QvCriticalSection {
  public:
    QvCriticalSection();
    ~QvCriticalSection();
    QvCriticalSection(const QvCriticalSection&) = delete;
    QvCriticalSection& operator=(const QvCriticalSection&) = delete;

    void enter();
    void leave();

  private:
    struct Lock;
    std::unique_ptr<Lock> lock_;
};

class QV_API QvLock {
  public:
    explicit QvLock(QvCriticalSection* section) : section_(section) { section_->enter(); }
    ~QvLock() { section_->leave(); }
    QvLock(const QvLock&) = delete;
    QvLock& operator=(const QvLock&) = delete;

  private:
    QvCriticalSection* section_;
};

// Not set at first. A wait that ends by the event resets it, so one post wakes one waiter; posts do not add
// up.
class QV_API QvEvent {
  public:
    QvEvent();
    ~QvEvent();
    QvEvent(const QvEvent&) = delete;
    QvEvent& operator=(const QvEvent&) = delete;

    // Waits at most this long; a negative time waits without limit. True if the event was set.
    bool wait(int milliseconds);
    void post();

  private:
    struct State;
    std::unique_ptr<State> state_;
};

// A count that never falls below 0: post adds one, wait takes one.
class QV_API QvSemaphore {
  public:
    explicit QvSemaphore(int initial = 0);
    ~QvSemaphore();
    QvSemaphore(const QvSemaphore&) = delete;
    QvSemaphore& operator=(const QvSemaphore&) = delete;

    // As QvEvent::wait. True if one was taken.
    bool wait(int milliseconds);
    void post(int count = 1);

  private:
    struct State;
    std::unique_ptr<State> state_;
};

// One worker thread. The destructor waits for it; neither that nor wait() may be called by the body itself.
class QV_API QvThread {
  public:
    QvThread();
    ~QvThread();
    QvThread(const QvThread&) = delete;
    QvThread& operator=(const QvThread&) = delete;

    // Runs `body`, which must not throw, on a new thread. -1 if one is running or not waited for yet, or if
    // the system has no more.
    int start(std::function<void()> body);
    void wait();  // until the body has ended; at once if none was started
    bool started() const { return thread_.joinable(); }

  private:
    std::thread thread_;
};

// The calling thread yields to interactive work for as long as the object lives.
class QV_API QvLowPriority {
  public:
    QvLowPriority();
    ~QvLowPriority();
    QvLowPriority(const QvLowPriority&) = delete;
    QvLowPriority& operator=(const QvLowPriority&) = delete;

  private:
    int former_;
};

QV_API void sleep(int milliseconds);  // of 0 and below: gives up the rest of the time slice
QV_API int processors();              // that this process may use, at least 1

}  // namespace QVThreads
