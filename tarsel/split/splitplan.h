// Where the picture of one long job is divided, so that several processes can make a part each.
#pragma once

#include <string>
#include <vector>

#include "tarsel/job/plan/jobplan.h"

struct SplitPlan {
    // Frames of the output: the first one of each part, and the end of the last.
    std::vector<long long> points;
    // Frames that a part makes in front of its own and throws away, as far as there are so many: what a
    // filter remembers of them is there when its own begin.
    long long leadIn = 0;

    size_t parts() const { return points.size() - 1; }
    long long first(size_t part) const { return points[part]; }
    long long lead(size_t part) const { return first(part) < leadIn ? first(part) : leadIn; }
    long long frames(size_t part) const { return points[part + 1] - points[part]; }
};

// The multiplexer that records units of the encoders, of which that of the job makes its film. "" for outputs
// whose parts are plain files.
std::string recorderOf(const JobPlan& plan);
inline bool isFilm(const JobPlan& plan) { return !recorderOf(plan).empty(); }

// Whether a picture has the same bytes wherever its part begins.
bool isCodedAlone(const PlannedStream& picture);

// The first one of a plan that has one.
const PlannedStream& pictureOf(const JobPlan& plan);

// A part may begin at multiples of so many frames of the output: there a frame of the input begins, and a
// sample of each sound of the output.
long long splitUnit(const JobPlan& plan);

// How parts share a machine of so many cores. `threads`: of each part, and `processors`: of the whole job, as
// they were given; 0 for neither.
struct PartShare {
    int atOnce, threads;
};
PartShare shareOf(size_t parts, int cores, int threads, int processors);

// As equal as these multiples allow, and fewer than `parts` where there are not enough of them. Throws
// Failure for a job whose parts would not be those of the whole, with the name of the filter that is in the
// way.
SplitPlan planSplit(const JobPlan& plan, int parts);
