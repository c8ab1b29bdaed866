// A stored task as a job.
#pragma once

#include <string>

#include "tarsel/job/joboptions.h"
#include "tarsel/job/task/storedtask.h"

// Opens the task and puts into the options what a command line would say of its job. The task's own output is
// taken if they name none. `job.quiet` and the like stay. Its command for afterwards is taken only if
// `allowPost`, with a warning otherwise. Throws Failure.
void openStoredJob(StoredTask& task, JobOptions& job, bool allowPost);
