// The start of a run: from a task with links to open inputs, links and output.
#pragma once

#include "core/transcode/run/runcontext_p.h"

class RunOpening {
  public:
    explicit RunOpening(const RunContext& run) : run_(run) {}

    // Checks the task, opens the links, seeks the inputs and, unless a first pass comes before it, opens the
    // output. QvStatus::ok, QvStatus::warning, or a failure after which the output is closed.
    int open();
    // 0 for an output that is open already. A failure closes the links.
    int openEncoder();

  private:
    void collectParams();
    void beginLogFile();
    int checkTask(int& warning);
    int openLinks();
    int seekInputs();
    void setMuxerLength();
    void copyMeta();
    void copyPipeError(int code);
    void logSettings() const;

    const RunContext& run_;
};
