// The parts of a divided job, as tasks that 'tarsel run' carries out.
#pragma once

#include <string>

#include "tarsel/split/splitplan.h"

// A task of the picture's part alone. `whole`: the job as a task. `output`: the name of the part's file, or
// that of the whole sequence's files in a folder of the part's own.
AnyDict pictureTask(const AnyDict& whole, const JobPlan& plan, const SplitPlan& split, size_t part,
                    const std::string& output);

// A task of all sounds over their whole length: what is done to sound often depends on all that came before,
// and it costs little next to the picture. `tiny`: a file of tinyBytes, whatever they are, which is a picture
// of the same length beside them: it makes them as long as in the whole.
AnyDict soundTask(const AnyDict& whole, const JobPlan& plan, const std::string& tiny,
                  const std::string& output);
long long tinyBytes(const JobPlan& plan);
