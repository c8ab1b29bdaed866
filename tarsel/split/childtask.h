// A task that runs in a process of its own, and what that process reports.
#pragma once

#include <string>
#include <vector>

#include "tarsel/host/childprocess.h"
#include "tarsel/job/progress.h"
#include "tarsel/split/progressreader.h"

class ChildTask {
  public:
    // `words`: arguments of the tool; they have to include "--progress json" to its standard error. `task`:
    // see handedTask. Throws Failure.
    ChildTask(const std::vector<std::string>& words, const Descriptor& task)
        : process_(words, ChildProcess::Stream::error, task.get()) {
        time_.start();
    }

    ChildProcess& process() { return process_; }
    const ChildProcess& process() const { return process_; }
    RunningTime& time() { return time_; }

    // Reads what it has reported since the last call. False once it has closed its end.
    bool readProgress();

    double done() const { return progress_.done(); }  // 0 to 1
    long long frames() const { return progress_.frames(); }
    double outSeconds() const { return progress_.outSeconds(); }
    double speed() const { return progress_.speed(); }  // negative if unknown
    // Those since the last call.
    std::vector<std::string> takeWarnings() { return progress_.takeWarnings(); }
    // Why it failed; "" if it has not, or gave no reason.
    const std::string& failure() const { return progress_.failure(); }
    const std::vector<std::string>& outputs() const { return progress_.outputs(); }

  private:
    ChildProcess process_;
    RunningTime time_;
    ProgressReader progress_;
};
