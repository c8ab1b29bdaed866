// Which part of each stream a job takes.
#pragma once

#include <string>

struct JobPlan;

// As they were given; empty when they were not.
struct PointOptions {
    std::string from, to, duration;
    std::string segment;  // the segment of a join that the times are of, for messages
};

// Sets the part of each stream of the plan. Times from the end are counted from the end of the picture for
// all streams, so that they stay in sync. An end after that of a stream is a warning. Throws Failure for
// points that leave nothing.
void planPoints(JobPlan& plan, const PointOptions& options);
