// What the user asks of a transcode: what it does, and how it is run.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/standardinput.h"
#include "tarsel/job/plan/planoptions.h"
#include "tarsel/job/progress.h"

struct JobOptions : PlanOptions {
    std::string raw;                               // format of a raw input
    bool noRotate = false;                         // films stay as they are coded
    std::shared_ptr<StandardInput> standardInput;  // read once, for all attempts; null when it is no input
    std::string post;                              // command that is run afterwards
    ProgressMode progress;
    OutputPolicy policy{false};
    std::string presetName;  // a preset's name or symbol
    int threads = 0;         // the most of each decoder and encoder; 0 for their own choice
    bool dryRun = false, quiet = false;
    bool relative = false;              // the task file has names that count from its folder
    bool unchanged = false;             // inputs that change meanwhile are failures
    bool strict = false;                // warnings are failures
    std::vector<std::string> warnings;  // of earlier attempts
    double measuredFor = -1;            // seconds that a pass over the sound took before; negative for none
};
