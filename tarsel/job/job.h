// A transcode of the tool: its options become a plan, which is printed or run.
#pragma once

#include "tarsel/host/signals.h"
#include "tarsel/job/inputlengths.h"
#include "tarsel/job/joboptions.h"
#include "tarsel/job/jobparts.h"
#include "tarsel/job/warnings.h"

class Job {
  public:
    // Opens the inputs, plans, and checks all names before any work. Throws Failure.
    Job(const JobOptions& options, Signals& signals);

    // With --strict: throws Failure if there is a warning.
    void checkWarnings() const;
    // Writes the task file if there is to be one, and prints the plan to the standard output.
    void printPlan();
    // Carries the plan out; see JobRun::run. Throws InputShrank for a job that can be run again.
    void run();
    // Whether the task file is a stream, which takes it once.
    bool taskIsStream() const { return parts_.outputs.taskIsStream(); }

  private:
    void openInputs();
    void joinSounds();
    std::vector<JobInput> readInputs() const;
    std::vector<std::string> filesRead() const;

    JobOptions options_;
    Signals& signals_;
    JobParts parts_;
    InputLengths lengths_;
    bool joined_ = false;  // the last source
    Warnings warnings_;
};
