// What the threads of a transcoder share: the state of the run, and the requests to stop and to pause it.
//
// `stopping` and the state are polled without a lock; the pause and the list of workers have one, and one
// condition wakes the threads that wait for a pause, a stop or the end of a run.
#pragma once

#include <atomic>
#include <condition_variable>
#include <list>
#include <memory>
#include <mutex>

#include "core/arch/qvcancel.h"
#include "core/engine/threads/qvthreads.h"

class RunControl {
  public:
    using Worker = std::list<std::unique_ptr<QVThreads::QvThread>>;

    // A QvTranscoder::State. It is published with release: a thread that sees it leave "transcoding" sees the
    // results of the run.
    int state() const { return state_.load(std::memory_order_acquire); }
    void setState(int value);
    void assertIdle() const;

    // --- The life of a run

    void prepare();  // asserts that nothing runs, and waits for the end of the previous worker
    void begin();
    void end(int newState);
    void addWorker(Worker& worker);
    void waitForEnd();  // until no run is going on, and joins the worker
    void joinWorkers();
    // False after the run, also if a failed start leaves state() at "transcoding".
    bool running() const { return running_; }
    int runNumber() const { return runNumber_; }
    bool onRunThread() const;  // this thread runs the job, so it can't wait for its end

    // --- Stop and pause

    // `next`: between two runs the request is for the next one.
    void askForStop(bool next);
    void stopLoop() { stopRequested_ = true; }
    bool stopping() const { return stopRequested_.load(std::memory_order_relaxed); }
    void waitUnlessStopped(int milliseconds);
    void pause();
    void resume();
    bool paused() const;
    // Holds this thread while a pause lasts; a stop ends it. `report` gets true before and false after it,
    // and may ask for the state of the pause.
    template <class Report>
    void waitWhilePaused(Report report) {
        if (synchronous || !paused()) return;
        report(true);
        waitForResume();
        report(false);
    }
    // Ends the waits of the output's streams, which share it.
    const std::shared_ptr<QvCancel>& cancel() const { return cancel_; }

    std::atomic<bool> synchronous{true};
    std::atomic<bool> inCallback{false};
    std::atomic<bool> firstPass{false};  // of a two-pass run

  private:
    void waitForResume();

    std::atomic<int> state_{0};
    std::atomic<bool> running_{false};
    std::atomic<int> runNumber_{0};
    std::atomic<bool> stopRequested_{false};
    const std::shared_ptr<QvCancel> cancel_ = std::make_shared<QvCancel>();

    mutable std::mutex lock_;
    std::condition_variable changed_;
    bool stopNext_ = false;  // asked for between two runs
    bool paused_ = false;
    Worker workers_;  // not joined yet; several when a callback of one run started the next
};

// While it lives this thread runs the job of a transcoder. Scopes nest: a callback may run another one.
class RunScope {
  public:
    explicit RunScope(const RunControl& owner) : owner_(&owner), outer_(innermost_) { innermost_ = this; }
    RunScope(const RunScope&) = delete;
    RunScope& operator=(const RunScope&) = delete;
    ~RunScope() { innermost_ = outer_; }
    static bool contains(const RunControl& owner);

  private:
    static thread_local const RunScope* innermost_;
    const RunControl* owner_;
    const RunScope* outer_;
};
