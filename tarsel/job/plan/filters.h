// Which filters each picture of a job passes, and the format in which it comes out of them.
#pragma once

#include <list>
#include <vector>

#include "tarsel/picture/picture.h"

struct JobPlan;
struct PlannedStream;

// Throws Failure for an option or filter without a stream that it works on.
void checkEffects(const JobPlan& plan, const EffectOptions& options);

class FilterPlanner {
  public:
    // Sets the format of each video stream, which the lengths depend on: the one that is `known` for its
    // number, or what the options make of its source. Plan and options have to outlive the planner. Throws
    // Failure for options that do not fit a stream.
    FilterPlanner(JobPlan& plan, const EffectOptions& options, const std::vector<PictureFormat>& known = {});
    // Sets the filters of all pictures and what they read and write. The lengths have to be known. Throws
    // Failure for filters that can't be used.
    void plan();

  private:
    void planPicture(PlannedStream& stream);

    JobPlan& plan_;
    std::list<EffectOptions> knownOptions_;  // for streams of known formats; pictures_ refers to them
    std::vector<PictureEffects> pictures_;   // of the video streams, by their numbers
};
