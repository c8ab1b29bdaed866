// Carries out a plan: runs the engine, shows the progress, checks what was written, and puts it in place.
#pragma once

#include <string>
#include <vector>

#include "tarsel/host/signals.h"
#include "tarsel/job/inputlengths.h"
#include "tarsel/job/jobparts.h"
#include "tarsel/job/jobtranscoder.h"
#include "tarsel/job/progress.h"
#include "tarsel/job/warnings.h"

class JobRun {
  public:
    // All have to outlive it.
    JobRun(const JobOptions& options, JobParts& parts, const InputLengths& lengths, Warnings& warnings,
           Signals& signals);
    // Once. Throws Failure; then nothing has its name, and what a stream has taken stays there.
    void run();

  private:
    void checkSpace() const;
    std::vector<ProcessParams> beginFilters();
    void transcode(const std::vector<ProcessParams>& params);
    void divide();
    void drive(JobTranscoder& transcoder);
    void boundThreads() const;
    int start(JobTranscoder& transcoder);
    void addClipped(const std::vector<long long>& clipped);
    void addEngineWarnings();
    void checkAndCommit();
    void report(const std::vector<std::string>& names) const;
    void stopIfSignalled() const;

    const JobOptions& options_;
    JobParts& parts_;
    const JobPlan& plan_;
    const InputLengths& lengths_;
    Warnings& warnings_;
    Signals& signals_;
    Progress progress_;
    const PlannedStream* endedEarly_ = nullptr;  // see JobTranscoder
    std::vector<long long> written_;             // frames or samples of each stream
};
