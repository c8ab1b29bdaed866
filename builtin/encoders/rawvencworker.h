// A thread that writes pictures from a queue of three, in the order in which they came.
#pragma once

#include <condition_variable>
#include <functional>
#include <thread>

#include "builtin/encoders/rawvencwriter.h"
#include "core/media/frameque.h"

class RawVideoWorker {
  public:
    // Runs on the worker's thread, for one picture at a time.
    using Write = std::function<RawVideoOutcome(const QvFrame&)>;

    RawVideoWorker() = default;
    ~RawVideoWorker();
    RawVideoWorker(const RawVideoWorker&) = delete;
    RawVideoWorker& operator=(const RawVideoWorker&) = delete;

    // Nothing runs after a failure. The failure of an earlier run is forgotten.
    RawVideoOutcome start(Write write);
    bool running() const { return thread_.joinable(); }
    // Copies the frame into the queue; waits only while all three places are taken. `copy` becomes the frame
    // in the queue, which is not to be changed and goes with stop(). Fails when the worker has failed.
    RawVideoOutcome put(const QvFrame& frame, QvFrame*& copy);
    // Ends the thread, after what is queued unless `discard`. The worker's failure.
    RawVideoOutcome stop(bool discard);

  private:
    void work();
    RawVideoOutcome writeSafely(const QvFrame& frame) noexcept;

    Write write_;
    // Shared with the thread, under the queue's lock.
    QvFrameQue queue_;
    std::condition_variable_any workReady_;
    std::condition_variable_any slotFree_;
    bool stop_ = false;
    bool discard_ = false;
    RawVideoOutcome failure_;
    std::thread thread_;
};
