// What the user asks of a transcode: what it does, and how it is run.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/standardinput.h"
#include "tarsel/job/plan/planoptions.h"
#include "tarsel/job/progress.h"

struct JobParts;
struct JobPlan;
class JobDivision;
class Warnings;

struct JobOptions : PlanOptions {
    std::string raw;                               // format of a raw input
    bool noRotate = false;                         // films stay as they are coded
    std::shared_ptr<StandardInput> standardInput;  // read once, for all attempts; null when it is no input
    std::string post;                              // command that is run afterwards
    ProgressMode progress;
    OutputPolicy policy{false};
    std::string presetName;                 // a preset's name or symbol
    std::shared_ptr<JobDivision> division;  // null for a job in one piece
    int threads = 0;                        // the most of each decoder and encoder; 0 for their own choice
    int processors = 0;                     // for all parts of a division; 0 for those of the machine
    bool dryRun = false, quiet = false;
    bool relative = false;              // the task file has names that count from its folder
    bool unchanged = false;             // inputs that change meanwhile are failures
    bool strict = false;                // warnings are failures
    std::vector<std::string> warnings;  // of earlier attempts
    double measuredFor = -1;            // seconds that a pass over the sound took before; negative for none
};

// How a job is carried out in parts that are put together afterwards.
class JobDivision {
  public:
    struct Given {
        const JobOptions& options;
        const JobParts& parts;
        AnyDict task;        // the job as a task
        std::string output;  // the name in the hidden folder that the multiplexer would write to
        Progress& progress;
        Warnings& warnings;
    };

    virtual ~JobDivision() = default;
    // How many were asked for. A task keeps it as "split".
    virtual int parts() const = 0;
    // Before any work. Throws Failure for a job that can't be divided.
    virtual void plan(const JobPlan& plan) = 0;
    // Lines for the user: what of the result is not as in one piece.
    virtual std::vector<std::string> notes() const = 0;
    // What --dry-run prints of it: lines.
    virtual std::string text() const = 0;
    // Frames or samples of each stream of the plan; nothing when it was stopped. Throws Failure.
    virtual std::vector<long long> run(const Given& given) = 0;
    // From any thread.
    virtual void requestStop() = 0;
    virtual void pause(bool paused) = 0;
    virtual ProgressState now() const = 0;
};
