// What was written, compared with what the plan asked for.
#pragma once

#include <vector>

#include "tarsel/job/jobparts.h"
#include "tarsel/job/warnings.h"

// `written`: frames or samples of each stream of the plan. An input that ended early is not the same as a
// wrong result; with `acceptPartial` it is a warning. Throws Failure.
void checkResult(const JobParts& parts, const std::vector<long long>& written, bool acceptPartial,
                 Warnings& warnings);
