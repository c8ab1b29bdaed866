// A task that runs as a process of its own, and what that process says.
#pragma once

#include <string>
#include <utility>
#include <vector>

#include "tarsel/host/childprocess.h"
#include "tarsel/job/progress.h"

class ChildTask {
  public:
    // `words`: arguments of the tool with which it sends objects (see docs/progress.schema.json) to its
    // standard error. `task`: see handedTask. Throws Failure.
    ChildTask(const std::vector<std::string>& words, const Descriptor& task)
        : process_(words, ChildProcess::Stream::error, task.get()) {
        time_.start();
    }

    ChildProcess& process() { return process_; }
    const ChildProcess& process() const { return process_; }
    RunningTime& time() { return time_; }

    // Takes what it has said. False when it will say no more.
    bool listen();

    double part() const { return part_; }  // 0 to 1
    long long frames() const { return frames_; }
    double outSeconds() const { return outSeconds_; }
    double speed() const { return speed_; }  // negative if unknown
    // What came since the last call.
    std::vector<std::string> takeWarnings() { return std::exchange(warnings_, {}); }
    const std::string& failure() const { return failure_; }  // of its end; "" if it did not say
    const std::vector<std::string>& outputs() const { return outputs_; }

  private:
    void take(const std::string& line);

    ChildProcess process_;
    RunningTime time_;
    std::string heard_;  // of a line that has not ended
    double part_ = 0, outSeconds_ = 0, speed_ = -1;
    long long frames_ = 0;
    std::vector<std::string> warnings_, outputs_;
    std::string failure_;
};
