// The parts of a divided job become its output.
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "tarsel/job/jobparts.h"

struct PartPictures {
    std::vector<std::string> files;  // one, or those of a sequence in their order
    long long lead = 0;              // frames at their beginning that are left out
};

struct PartFiles {
    std::vector<PartPictures> pictures;  // of each part
    std::vector<std::string> sounds;     // in the order of the streams
};

// Puts the output together under `output`, the name in the hidden folder that the multiplexer of the whole
// would write to. `watch` gets the share that is done and returns false to stop. False if it was stopped.
// Throws Failure, also for a part that does not have the length of its share.
bool joinParts(const JobParts& parts, const PartFiles& files, const std::string& output,
               const std::function<bool(double)>& watch);
