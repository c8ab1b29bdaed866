#include "core/batch/batchcontrol_p.h"

#include "core/arch/qvassert.h"
#include "core/transcode/run/qvtranscoder.h"

// --- Begin and end of a run.

void BatchControl::start(bool synchronous) {
    synchronous_ = synchronous;
    pauseRequested_ = false;
    stopRequested_ = false;
    paused_ = false;
    running_ = true;
}

void BatchControl::begin(bool synchronous) {
    std::unique_lock guard(lock_);
    // The callback at the end of a run can't wait for its own end.
    const bool self = life_ != Life::idle && runThread_ == std::this_thread::get_id();
    QV_ASSERT_MSG(!running_ && !self, "BatchProcessor: must not call start() while running()");
    changed_.wait(guard, [this] { return life_ == Life::idle; });
    start(synchronous);
    life_ = Life::begun;
}

bool BatchControl::enter() {
    const std::lock_guard guard(lock_);
    QV_ASSERT_MSG(life_ == Life::idle || life_ == Life::begun,
                  "BatchProcessor: must not call run() while running()");
    const bool own = life_ == Life::idle;
    if (own) start(true);
    life_ = Life::entered;
    runThread_ = std::this_thread::get_id();
    return own;
}

void BatchControl::leave() {
    const std::lock_guard guard(lock_);
    if (life_ == Life::entered) life_ = Life::left;
    paused_ = false;
    running_ = false;
    changed_.notify_all();
}

void BatchControl::end() {
    const std::lock_guard guard(lock_);
    paused_ = false;
    running_ = false;
    if (synchronous_) pauseRequested_ = stopRequested_ = false;
    life_ = Life::idle;
    runThread_ = std::thread::id();
    changed_.notify_all();
}

void BatchControl::waitForEnd() {
    std::unique_lock guard(lock_);
    changed_.wait(guard, [this] { return life_ == Life::idle; });
}

bool BatchControl::onRunThread() const {
    const std::lock_guard guard(lock_);
    return runThread_ == std::this_thread::get_id();
}

// --- Stop and pause.

void BatchControl::requestStop() {
    const std::lock_guard guard(lock_);
    pauseRequested_ = false;
    stopRequested_ = true;
    if (stopTarget_) stopTarget_->requestStop();
    changed_.notify_all();
}

void BatchControl::dropRequests() {
    const std::lock_guard guard(lock_);
    if (life_ == Life::idle) pauseRequested_ = stopRequested_ = false;
}

void BatchControl::pause(bool on) {
    const std::lock_guard guard(lock_);
    QV_ASSERT_MSG(!(running_ && synchronous_), "Must not pause/resume in synchronous mode");
    pauseRequested_ = on;
    changed_.notify_all();
}

bool BatchControl::beginPause() {
    if (!pauseRequested_) return false;
    const std::lock_guard guard(lock_);
    return paused_ = pauseRequested_ && !stopRequested_;
}

void BatchControl::waitForResume() {
    std::unique_lock guard(lock_);
    changed_.wait(guard, [this] { return !pauseRequested_ || stopRequested_; });
    paused_ = false;
}

BatchControl::StopTarget::StopTarget(BatchControl& control, QvTranscoder& transcoder) : control_(control) {
    const std::lock_guard guard(control_.lock_);
    control_.stopTarget_ = &transcoder;
    if (control_.stopRequested_) transcoder.requestStop();
}

BatchControl::StopTarget::~StopTarget() {
    const std::lock_guard guard(control_.lock_);
    control_.stopTarget_ = nullptr;
}
