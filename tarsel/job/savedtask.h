// A job as a task file.
#pragma once

#include "tarsel/host/signals.h"
#include "tarsel/job/jobparts.h"

// The job as it is stored, with absolute names and its command for afterwards.
AnyDict storedState(JobParts& parts, const JobOptions& options);

// Writes it where the outputs say, if there is to be one. A stream that waits for its reader is left at the
// first signal. Throws Failure.
void saveTask(JobParts& parts, const JobOptions& options, Signals& signals);
