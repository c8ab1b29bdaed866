// --split: a long job whose picture is made in parts at the same time.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "tarsel/job/joboptions.h"
#include "tarsel/job/task/storedtask.h"

// Where the parts are made.
struct SplitPlace {
    bool slurm = false;                // on a cluster, as a job array; false: as processes of this machine
    std::vector<std::string> options;  // for sbatch
};

// A division of a job into `parts` parts, for JobOptions::division; null for "". Throws Failure (usage) for a
// text that is no valid number of parts (2 is the least), and for --slurm without parts.
std::shared_ptr<JobDivision> makeSplit(const std::string& parts, const SplitPlace& place = {});
// The division that is stored in the task; null if there is none.
std::shared_ptr<JobDivision> storedSplit(const StoredTask& task);
