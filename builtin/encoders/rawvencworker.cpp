#include "builtin/encoders/rawvencworker.h"

#include <exception>
#include <mutex>
#include <utility>

#include "builtin/encoders/rawvencformats.h"
#include "core/arch/platform.h"
#include "core/arch/qvexception.h"
#include "core/engine/status.h"

namespace {

constexpr int queuedFrames = 3;

}  // namespace

RawVideoWorker::~RawVideoWorker() {
    if (running()) stop(true);
}

RawVideoOutcome RawVideoWorker::start(Write write) {
    failure_ = {};
    if (const int result = queue_.init(queuedFrames)) return {result, false, 0, "Out of memory"};
    stop_ = discard_ = false;
    write_ = std::move(write);
    thread_ = qv_platform().startThread([this] { work(); });
    if (running()) return {};
    queue_.destroy();
    return {QvStatus::failed, false, 0, "Can not start the writing thread"};
}

RawVideoOutcome RawVideoWorker::put(const QvFrame& frame, QvFrame*& copy) {
    std::unique_lock lock(queue_);
    slotFree_.wait(lock, [this] { return queue_.nrEmpty() > 0 || failure_.status != 0; });
    if (failure_.status != 0) return failure_;
    QvFrame* slot = queue_.emptyBuffer();  // stays at the head: the worker only appends
    lock.unlock();
    const int copied = rawvenc::copyPacked(*slot, frame);
    lock.lock();
    if (copied != QvStatus::ok) return {copied, false, 0, "Out of memory"};
    // The last to be taken for another picture: all slots that are empty by then have been so for longer.
    copy = slot;
    queue_.moveToFull();
    workReady_.notify_one();
    return {};
}

void RawVideoWorker::work() {
    std::unique_lock lock(queue_);
    while (failure_.status == 0) {
        workReady_.wait(lock, [this] { return stop_ || queue_.nrFull() > 0; });
        if (queue_.nrFull() == 0 || (stop_ && discard_)) break;
        const QvFrame& frame = *queue_.fullBuffer();
        lock.unlock();
        auto outcome = writeSafely(frame);
        lock.lock();
        failure_ = std::move(outcome);
        queue_.moveToEmpty();
        slotFree_.notify_one();
    }
    slotFree_.notify_all();
}

RawVideoOutcome RawVideoWorker::writeSafely(const QvFrame& frame) noexcept {
    try {
        return write_(frame);
    } catch (const QvException& failure) {
        return {QvStatus::failed, false, 0, failure.what()};
    } catch (const std::exception& failure) {
        return {QvStatus::failed, false, 0, failure.what()};
    }
}

RawVideoOutcome RawVideoWorker::stop(bool discard) {
    {
        const std::lock_guard lock(queue_);
        stop_ = true;
        discard_ = discard;
        workReady_.notify_one();
    }
    thread_.join();
    queue_.destroy();
    return failure_;
}
