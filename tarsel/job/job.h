// A transcode of the tool: its options become a plan, which is printed or run.
#pragma once

#include <functional>
#include <memory>
#include <utility>
#include <vector>

#include "tarsel/host/signals.h"
#include "tarsel/job/inputlengths.h"
#include "tarsel/job/joboptions.h"
#include "tarsel/job/jobparts.h"
#include "tarsel/job/task/joinlevel.h"
#include "tarsel/job/warnings.h"

class Job {
  public:
    // Opens the inputs, plans, and checks all names before any work. Throws Failure.
    Job(const JobOptions& options, Signals& signals);
    // The same with a stored task, which is open; the options say where its output goes.
    Job(const JobOptions& options, std::unique_ptr<StoredTask> task, Signals& signals);

    // With --strict: throws Failure if there is a warning.
    void checkWarnings() const;
    // Whether sounds have to be measured before the job is made once more, with the gains in its options.
    bool needsGains() const { return level_ != nullptr; }
    // The gains, and how many seconds they took. Shows progress as a first pass. Throws Failure, also when it
    // was stopped.
    std::pair<std::vector<double>, double> measureGains();
    // The job as a task; see storedState.
    AnyDict stored();
    // The names that it writes to, in a form by which places can be compared.
    std::vector<std::string> places() const { return parts_.outputs.places(); }
    // Writes the task file if there is to be one, and prints the plan to the standard output.
    void printPlan();
    // Carries the plan out; see JobRun::run. Throws InputShrank for a job that can be run again.
    void run();
    // Whether the task file is a stream, which takes it once.
    bool taskIsStream() const { return parts_.outputs.taskIsStream(); }

  private:
    void begin(JobPlan plan);
    std::unique_ptr<Source> openInput(const std::string& name);
    void openInputs();
    void joinInputs();
    void fitToInputs();
    void joinSounds();
    std::vector<JobInput> readInputs() const;
    std::vector<std::string> filesRead() const;

    JobOptions options_;
    Signals& signals_;
    JobParts parts_;
    InputLengths lengths_;
    bool rawTaken_ = false;  // --raw describes an input
    bool joined_ = false;    // the last source
    Warnings warnings_;
    std::unique_ptr<JoinLevel> level_;
};

// Makes the job, complete but for its run: with the gains of its sounds, which are measured if it needs them.
// Throws Failure.
std::unique_ptr<Job> readyJob(JobOptions& options, const std::function<std::unique_ptr<Job>()>& make);
// Makes the job, and prints or runs it; once more where an input has become shorter meanwhile and the options
// take what is there. Throws Failure.
void runJob(JobOptions& options, const std::function<std::unique_ptr<Job>()>& make);
