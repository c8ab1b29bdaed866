// The tasks of a list that are left, given to a scheduler.
#pragma once

#include <string>
#include <vector>

#include "tarsel/batch/arrays.h"
#include "tarsel/batch/batchfile.h"
#include "tarsel/cluster/scheduler.h"
#include "tarsel/cluster/submissions.h"

struct SubmitOptions {
    size_t arraySize = 1;  // the most tasks of an array
    int atOnce = 0;        // of an array; 0 for no limit
    bool verify = false;   // what was done is known by its bytes as well
    std::string log;       // absolute; a task logs to this name with "." and the task's; "" for nowhere
    std::vector<std::string> command;  // the arguments of the tool, to which --threads and --task are added
    std::vector<std::string> options;  // for the scheduler
};

class Submitter {
  public:
    // All have to outlive it.
    Submitter(const BatchFile& file, const Scheduler& scheduler, const SubmitOptions& options);
    // What is neither done nor queued nor running. Once. Throws Failure; what was submitted until then stays
    // so.
    void submit();

    size_t submitted() const { return submitted_; }
    size_t doneBefore() const { return done_; }
    size_t living() const { return living_; }  // tasks that were queued or ran already
    const std::vector<std::string>& jobs() const { return jobs_; }

  private:
    void forgetEnded();
    void removeFiles(const std::string& array) const;
    std::vector<TaskPlace> places();
    std::string newName();
    std::string submitArray(const TaskArray& array);
    void forget(const std::string& array, const std::vector<std::string>& others);
    bool isUnknown(const std::string& name) const;

    const BatchFile& file_;
    const Scheduler& scheduler_;
    const SubmitOptions& options_;
    Submissions submissions_;
    ClusterQueue queue_;
    QvBatchList list_;
    std::vector<BatchTask> tasks_;
    std::vector<std::vector<Before>> order_;
    std::vector<std::string> jobs_;
    size_t due_ = 0, submitted_ = 0, done_ = 0, living_ = 0;
    int count_ = 0;
};

struct CancelledJobs {
    std::vector<std::string> jobs;
    size_t left = 0;  // elements that have not ended yet
};

// Takes back what the scheduler has of a list, and waits a while for the end of what runs. Throws Failure.
CancelledJobs cancelSubmitted(const BatchFile& file, const Scheduler& scheduler);
