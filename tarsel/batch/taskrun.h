// One task of a list, carried out in this process, and its journal.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "tarsel/batch/batchfile.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/joboptions.h"

struct TaskRun {
    JobOptions job;  // how it is run: progress, policy, quiet, ...
    bool allowPost = false, verify = false;
    // Makes a task's words the options of a job. Throws Failure.
    std::function<void(const std::vector<std::string>& words, JobOptions& job)> plan;

    // Throws Failure if the task must not begin; empty if it may. Asked when the task is this process's.
    std::function<void()> ready;

    // Waits while another process runs the task. Does nothing if the journal says that it is done and its
    // outputs stand. Throws Failure as the job does; then the journal says why, and the task is not done.
    void run(const BatchFile& file, const BatchTask& task, Signals& signals) const;

  private:
    void carryOut(const BatchFile& file, const BatchTask& task, const OutputPolicy& policy,
                  Signals& signals) const;
};

// Throws Failure (input) for a task that can't be run as it is stored.
void requireSound(const BatchTask& task, const std::string& shown);

// Throws Failure (input) if a font family that the task draws with is not installed here. Another one would
// take its place, and the pictures would be other ones than on the next machine.
void requireFonts(const AnyDict& state, const std::string& shown);

// "night.xml (task 3)".
std::string shownTask(const BatchFile& file, const BatchTask& task);

// Removes what a process that was ended has left next to the output of a task.
void tidyAfter(const BatchTask& task, const OutputPolicy& policy);
