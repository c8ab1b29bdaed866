// --split: a long job whose picture is made in parts, side by side.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "tarsel/job/joboptions.h"
#include "tarsel/job/task/storedtask.h"

// Where the parts are made.
struct SplitPlace {
    bool slurm = false;                // as elements of an array, not as processes of this machine
    std::vector<std::string> options;  // for sbatch
};

// A division of a job into so many parts, for JobOptions::division; null for "". Throws Failure (usage) for a
// text that is no whole number from 2 on, and for a place without parts.
std::shared_ptr<JobDivision> makeSplit(const std::string& parts, const SplitPlace& place = {});
// The one that a task asks for; null for none.
std::shared_ptr<JobDivision> storedSplit(const StoredTask& task);
