// The options that say what a job does, of all commands that take a job.
#pragma once

#include <string>

#include "tarsel/job/joboptions.h"
#include "tarsel/words/commandline.h"

// Options as they were given; they are parsed once the command runs.
struct GivenJob {
    JobOptions job;
    std::string samplerate, channels, bits, split;
    std::string vcodec, acodec;  // NAME[:key=value,...]
};

void addJobOptions(Command& command, GivenJob& given, Need inputs);
// Makes them the options of a job. The engine has to be started. Throws Failure.
void resolveJob(GivenJob& given);
