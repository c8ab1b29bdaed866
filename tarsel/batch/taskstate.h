// In which state each task of a list is, by its journal and by what a scheduler has of the list.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "tarsel/batch/batchfile.h"
#include "tarsel/batch/journal.h"
#include "tarsel/cluster/scheduler.h"
#include "tarsel/cluster/submissions.h"

struct TaskState {
    // waiting, disabled, queued, submitted (the scheduler does not answer), running, interrupted, lost,
    // failed, changed or done
    const char* name;
    TaskRecord record;
};

class TaskStates {
  public:
    // Both have to outlive it. Asks the scheduler if it was given tasks of the list; without an answer there
    // is a warning.
    TaskStates(const BatchFile& file, const Scheduler& scheduler);

    TaskState of(const BatchTask& task) const;
    // "123_4" of a task that is in the queue or runs; otherwise "".
    std::string jobOf(const BatchTask& task) const;
    // The scheduler's word for the end of a task that is lost; "" where it keeps none.
    std::string endOf(const BatchTask& task, const TaskState& state);

  private:
    const ClusterQueue::Place* placeOf(const BatchTask& task) const;

    const BatchFile& file_;
    const Scheduler& scheduler_;
    Submissions submissions_;
    ClusterQueue queue_;
    bool answered_ = false;
    std::optional<std::map<std::pair<std::string, size_t>, std::string>> ends_;
};
