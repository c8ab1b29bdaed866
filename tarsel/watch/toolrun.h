// One transcode of a watched file, as a process of its own, and what came of it.
#pragma once

#include <functional>
#include <mutex>
#include <string>
#include <vector>

#include "tarsel/host/childprocess.h"
#include "tarsel/host/follow/wake.h"
#include "tarsel/job/progress.h"

struct ToolResult {
    int status = -1;      // the exit status, or minus a signal's number
    std::string failure;  // one line; "" if it ended with 0
    std::vector<std::string> warnings, outputs;
    double seconds = 0, speed = -1;  // as in JobFigures
    std::string printed;             // on the standard output
};

class ToolRun {
  public:
    // `wake`: stops the run. `other`: a descriptor that `arrived` is called for while the run lasts.
    ToolRun(Wake& wake, int other, std::function<void()> arrived)
        : wake_(wake), other_(other), arrived_(std::move(arrived)) {}

    // A run whose standard output is wanted.
    ToolResult ask(const std::vector<std::string>& arguments);
    // One that sends the objects of --progress json, which is added. `progress` gets those of its work.
    ToolResult work(std::vector<std::string> arguments,
                    const std::function<void(const ProgressState&)>& progress);

    // To the run that there is, from any thread.
    void endAtOnce() const;  // it is given a moment for what it would leave
    void pause() const;
    void resume() const;

  private:
    class Running;
    ToolResult run(const std::vector<std::string>& arguments, ChildProcess::Stream stream,
                   const std::function<void(std::string&)>& got);

    void reach(void (ChildProcess::*call)() const) const;

    Wake& wake_;
    int other_;
    std::function<void()> arrived_;
    mutable std::mutex lock_;  // of the one below
    ChildProcess* running_ = nullptr;
};
