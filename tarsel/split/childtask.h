// A task that runs as a process of its own, and what that process says.
#pragma once

#include <string>
#include <vector>

#include "tarsel/host/childprocess.h"
#include "tarsel/job/progress.h"
#include "tarsel/split/tasktalk.h"

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

    double part() const { return talk_.part(); }  // 0 to 1
    long long frames() const { return talk_.frames(); }
    double outSeconds() const { return talk_.outSeconds(); }
    double speed() const { return talk_.speed(); }  // negative if unknown
    // What came since the last call.
    std::vector<std::string> takeWarnings() { return talk_.takeWarnings(); }
    const std::string& failure() const { return talk_.failure(); }  // of its end; "" if it did not say
    const std::vector<std::string>& outputs() const { return talk_.outputs(); }

  private:
    ChildProcess process_;
    RunningTime time_;
    TaskTalk talk_;
};
