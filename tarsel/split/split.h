// --split: a long job whose picture is made in parts, side by side.
#pragma once

#include <memory>

#include "tarsel/job/joboptions.h"
#include "tarsel/job/task/storedtask.h"

// A division of a job into so many parts, for JobOptions::division. Throws Failure (usage) for a number that
// is none, or below 2.
std::shared_ptr<JobDivision> makeSplit(const std::string& parts);
// The one that a task asks for; null for none.
std::shared_ptr<JobDivision> storedSplit(const StoredTask& task);
