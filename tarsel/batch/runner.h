// The tasks of a list, each run as a process of its own.
#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "tarsel/batch/batchfile.h"
#include "tarsel/batch/order.h"
#include "tarsel/batch/result.h"
#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/progress.h"
#include "tarsel/split/childtask.h"

struct BatchOptions {
    int jobs = 1;         // processes at a time
    int retries = 0;      // of a task that failed
    double timeout = -1;  // seconds that a task may run, without pauses; negative: no limit
    std::string timeoutText;
    bool stopOnError = false;  // begin no task after one has failed
    bool verify = false;       // what was done is known by its bytes as well
    bool quiet = false;
    ProgressMode progress;
    OutputPolicy policy{false};
    std::string log;  // absolute; a task's process logs to this name with "." and the task's; "" for nowhere
    // The arguments of a task's process, to which its number is added.
    std::vector<std::string> command;
};

class BatchRunner {
  public:
    // All have to outlive it.
    BatchRunner(const BatchFile& file, const BatchOptions& options, Signals& signals);
    // Once. Nothing in it throws because a task fails. Throws Failure if no task can be begun at all.
    BatchResult run();

  private:
    struct Entry {
        BatchTask task;
        BatchTaskResult result;
        double weight = 0;  // of its part of the whole
        bool ended = false;
        bool timedOut = false, killed = false;
        std::unique_ptr<ChildTask> child;
    };

    void prepare();
    bool isDue(const Entry& entry, size_t index);
    void begin();
    void start(Entry& entry);
    void startChild(Entry& entry);
    void listen();
    void collect(Entry& entry);
    void limit(Entry& entry);
    void end(Entry& entry, TaskEnd how);
    void fail(Entry& entry, int status, const std::string& line);
    void show();
    void report(const Entry& entry, const char* state) const;
    void say(const std::string& line);
    void stopAll();
    bool endAtOnce();
    bool setPaused(bool paused);  // whether that is a change
    void pressed(char key);
    BatchResult result();
    int running() const;

    const BatchFile& file_;
    const BatchOptions& options_;
    Signals& signals_;
    QvBatchList list_;
    std::vector<Entry> entries_;
    std::vector<std::vector<Before>> order_;
    Progress progress_;
    Bell bell_;
    std::time_t start_ = 0;
    size_t first_ = 0;  // all before it have ended
    bool failed_ = false;
    double wholeWeight_ = 0, endedWeight_ = 0, endedSeconds_ = 0;
    long long endedFrames_ = 0;
    std::mutex lock_;  // of the children, which signals and keys reach as well
    std::atomic<bool> stopping_{false}, paused_{false}, suspended_{false};
};
