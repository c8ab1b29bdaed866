// --split: a long job whose picture is made in parts, side by side.
#pragma once

#include <memory>

#include "tarsel/job/joboptions.h"

// A division of a job into so many parts, for JobOptions::division. Throws Failure (usage) for a number that
// is none, or below 2.
std::shared_ptr<JobDivision> makeSplit(const std::string& parts);
