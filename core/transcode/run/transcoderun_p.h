// One run of a transcoder: opening, its passes, and closing.
#pragma once

#include <functional>
#include <utility>

#include "core/transcode/run/runcontext_p.h"
#include "core/transcode/run/runcontrol_p.h"

class Any;
class MainLoop;

// A worker takes a copy with it.
class TranscodeRun {
  public:
    // `returnTask` ends the loan of a task. It is called after cbDone, unless that has started another run.
    TranscodeRun(const RunContext& run, std::function<void()> returnTask)
        : run_(run), returnTask_(std::move(returnTask)), number_(run.control.runNumber()) {}

    // See RunOpening.
    int open();
    // The run itself, from the first step to cbDone. The error, or 0.
    int start();
    // Leaves everything closed after an open without a start.
    void giveUp();

  private:
    int breakOff();
    int work();
    int runPasses(MainLoop& loop);
    void forgetStatistics();
    int closeOutput(int result);
    int finish(int result);
    int postprocess(const Any& command);
    template <class Work>
    int guarded(Work work);
    bool stopping() const { return run_.control.stopping(); }
    // A callback can have started the next run before this one has ended.
    bool isLatest() const { return number_ == run_.control.runNumber(); }

    RunContext run_;
    std::function<void()> returnTask_;
    int number_;
    bool endOfVideo_ = false;
};
