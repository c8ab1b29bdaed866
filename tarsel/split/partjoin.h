// Joins the parts of a divided job into its output.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "tarsel/job/jobparts.h"

struct PartPictures {
    std::vector<std::string> files;  // one, or those of a sequence in order
    long long lead = 0;              // frames at their beginning that don't belong to the output
};

struct PartFiles {
    std::vector<PartPictures> pictures;  // one element for each part
    std::vector<std::string> sounds;     // in the order of the streams
};

// `output`: the name that a job in one piece would write, in the hidden folder of the outputs. `watch` gets
// the share that is done, 0 to 1, and returns false to stop. False if it was stopped. Throws Failure, also if
// the parts do not have the expected length.
bool joinParts(const JobParts& parts, const PartFiles& files, const std::string& output,
               const std::function<bool(double)>& watch);
