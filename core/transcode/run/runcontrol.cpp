#include "core/transcode/run/runcontrol_p.h"

#include <chrono>

#include "core/arch/qvassert.h"
#include "core/transcode/run/qvtranscoder.h"

void RunControl::setState(int value) {
    {
        const std::lock_guard guard(lock_);
        state_.store(value, std::memory_order_release);
    }
    changed_.notify_all();
}

void RunControl::assertIdle() const { QV_ASSERT(state() != QvTranscoder::transcoding); }

void RunControl::prepare() {
    QV_ASSERT(!running_);
    if (!onRunThread()) joinWorkers();
}

void RunControl::begin() {
    ++runNumber_;
    {
        const std::lock_guard guard(lock_);
        stopRequested_ = stopNext_;
        if (!stopNext_) cancel_->clear();
        stopNext_ = false;
        running_ = true;
    }
    setState(QvTranscoder::transcoding);
}

void RunControl::end(int newState) {
    {
        const std::lock_guard guard(lock_);
        running_ = false;
        state_.store(newState, std::memory_order_release);
    }
    changed_.notify_all();
}

void RunControl::addWorker(Worker& worker) {
    const std::lock_guard guard(lock_);
    workers_.splice(workers_.end(), worker);
}

void RunControl::waitForEnd() {
    {
        std::unique_lock guard(lock_);
        const int number = runNumber_;
        changed_.wait(guard, [&] { return !running_ || runNumber_ != number; });
    }
    joinWorkers();
}

// Joined outside the lock, which the worker needs for its end.
void RunControl::joinWorkers() {
    Worker ended;
    const std::lock_guard guard(lock_);
    ended.swap(workers_);
}

bool RunControl::onRunThread() const { return RunScope::contains(*this); }

void RunControl::askForStop(bool next) {
    {
        const std::lock_guard guard(lock_);
        if (!synchronous) paused_ = false;
        stopRequested_ = true;
        if (next && !running_) stopNext_ = true;
        cancel_->request();
    }
    changed_.notify_all();
}

void RunControl::waitUnlessStopped(int milliseconds) {
    std::unique_lock guard(lock_);
    changed_.wait_for(guard, std::chrono::milliseconds(milliseconds), [this] { return stopping(); });
}

void RunControl::pause() {
    const std::lock_guard guard(lock_);
    paused_ = true;
}

void RunControl::resume() {
    {
        const std::lock_guard guard(lock_);
        paused_ = false;
    }
    changed_.notify_all();
}

bool RunControl::paused() const {
    const std::lock_guard guard(lock_);
    return paused_;
}

void RunControl::waitForResume() {
    std::unique_lock guard(lock_);
    changed_.wait(guard, [this] { return !paused_ || stopping(); });
}

thread_local const RunScope* RunScope::innermost_ = nullptr;

bool RunScope::contains(const RunControl& owner) {
    for (const RunScope* scope = innermost_; scope; scope = scope->outer_)
        if (scope->owner_ == &owner) return true;
    return false;
}
