// The plan of a stored task, as JobRun takes it.
#pragma once

#include "tarsel/job/plan/jobplan.h"
#include "tarsel/job/task/storedtask.h"

// What the task's multiplexer makes.
OutputKind taskOutputKind(const StoredTask& task);

// The task has to be open. Throws Failure for what can't be done.
JobPlan planTask(const StoredTask& task, const OutputForm& output, std::vector<JobInput> inputs,
                 bool acceptPartial);
