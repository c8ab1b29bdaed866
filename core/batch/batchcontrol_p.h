// What the threads of a batch processor share: the state of the run, and requests to stop and to pause it.
//
// All of it changes under one lock. What is read often is atomic and read without the lock. One condition
// wakes the threads that wait for the end of a pause or of a run.
#pragma once

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <thread>

class QvTranscoder;

class BatchControl {
  public:
    // --- Begin and end of a run. It ends in two steps: after leave() no task follows, but the last callback
    // may still be running until end().

    // Asserts that no run is under way. Waits for the last callback of the previous one.
    void begin(bool synchronous);
    // On the thread that runs the tasks. True if it had to begin the run itself.
    bool enter();
    void leave();
    void end();
    void waitForEnd();
    bool running() const { return running_; }
    bool synchronous() const { return synchronous_; }
    bool onRunThread() const;

    std::atomic<int> task{0};
    std::atomic<int> segment{0};  // disabled segments are counted

    // --- Stop and pause

    void requestStop();
    // Forgets requests that came after the end of a run, so that they don't affect the next one.
    void dropRequests();
    bool stopping() const { return stopRequested_; }
    void pause(bool on);
    bool paused() const { return paused_; }
    // Blocks during a pause, which a stop also ends. True if there was one; then `report` was called with
    // true before it and with false after it.
    template <class Report>
    bool waitWhilePaused(Report report) {
        if (!beginPause()) return false;
        report(true);
        waitForResume();
        report(false);
        return true;
    }

    // While it exists, requestStop() also stops the transcoder, which may be waiting for the reader of an
    // output.
    class StopTarget {
      public:
        StopTarget(BatchControl& control, QvTranscoder& transcoder);
        StopTarget(const StopTarget&) = delete;
        StopTarget& operator=(const StopTarget&) = delete;
        ~StopTarget();

      private:
        BatchControl& control_;
    };

  private:
    enum class Life { idle, begun, entered, left };  // after end(), begin(), enter(), leave()

    bool beginPause();
    void waitForResume();
    void start(bool synchronous);

    mutable std::mutex lock_;
    std::condition_variable changed_;
    Life life_ = Life::idle;
    std::thread::id runThread_;
    QvTranscoder* stopTarget_ = nullptr;
    std::atomic<bool> running_{false};
    std::atomic<bool> synchronous_{false};
    std::atomic<bool> paused_{false};
    std::atomic<bool> pauseRequested_{false};
    std::atomic<bool> stopRequested_{false};
};
