// The parts of a divided job, as tasks that 'tarsel run' carries out.
#pragma once

#include <string>

#include "tarsel/split/splitplan.h"

// The task that makes one part of the picture, without sound. `whole`: the job as a task. `output`: the name
// of the part's file; for a sequence, the name of the output in the part's own folder.
AnyDict pictureTask(const AnyDict& whole, const JobPlan& plan, const SplitPlan& split, size_t part,
                    const std::string& output);

// The task that makes all sounds in one piece: filters and encoders of sound often depend on everything
// before, and they take little time. The expected length of sound follows from the picture, so a placeholder
// of 2x2 pixels takes its place: `placeholder` is the name of a raw video file of placeholderBytes() with any
// content.
AnyDict soundTask(const AnyDict& whole, const JobPlan& plan, const std::string& placeholder,
                  const std::string& output);
long long placeholderBytes(const JobPlan& plan);
