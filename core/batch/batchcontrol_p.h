// What the threads of a batch processor share: the state of the run, and requests to stop and to pause it.
//
// All of it is changed under one lock; what is asked for often is also readable without. One condition wakes
// the threads that wait for the end of a pause or of a run.
#pragma once

#include <atomic>
#include <condition_variable>
#include <mutex>
#include <thread>

class QvTranscoder;

class BatchControl {
  public:
    // --- The life of a run. It ends in two steps: leave() says that no task will follow, and the callback of
    // that may still be under way until end().

    void begin(
        bool synchronous);  // asserts that nothing runs; waits for the last callback of the previous run
    // On the thread that runs the tasks. True if it had to begin the run itself.
    bool enter();
    void leave();
    void end();
    void waitForEnd();
    bool running() const { return running_; }
    bool synchronous() const { return synchronous_; }
    bool onRunThread() const;

    std::atomic<int> task{0};
    std::atomic<int> segment{0};  // with disabled ones counted

    // --- Stop and pause

    void requestStop();
    // Between runs: a request that came too late is not for the next run.
    void dropRequests();
    bool stopping() const { return stopRequested_; }
    void pause(bool on);
    bool paused() const { return paused_; }
    // Holds this thread while a pause lasts, and is true if there was one. `report` gets true before and
    // false after it. A stop ends it.
    template <class Report>
    bool waitWhilePaused(Report report) {
        if (!beginPause()) return false;
        report(true);
        waitForResume();
        report(false);
        return true;
    }

    // While it lives a stop also goes to the transcoder, where it ends the wait for the reader of an output.
    class Current {
      public:
        Current(BatchControl& control, QvTranscoder& transcoder);
        Current(const Current&) = delete;
        Current& operator=(const Current&) = delete;
        ~Current();

      private:
        BatchControl& control_;
    };

  private:
    enum class Life { idle, begun, entered, left };

    bool beginPause();
    void waitForResume();
    void start(bool synchronous);

    mutable std::mutex lock_;
    std::condition_variable changed_;
    Life life_ = Life::idle;
    std::thread::id runThread_;
    QvTranscoder* current_ = nullptr;
    std::atomic<bool> running_{false};
    std::atomic<bool> synchronous_{false};
    std::atomic<bool> paused_{false};
    std::atomic<bool> pauseRequested_{false};
    std::atomic<bool> stopRequested_{false};
};
