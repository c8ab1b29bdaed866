// Where the picture of one long job is divided, so that several processes can make a part each.
#pragma once

#include <string>
#include <vector>

#include "tarsel/job/plan/jobplan.h"

struct SplitPlan {
    // Frames of the output: the first one of each part, and the end of the last.
    std::vector<long long> points;
    // Frames that a part makes before its own, as far as the output has them, and that are dropped when the
    // parts are joined. Filters that use earlier frames need them.
    long long leadIn = 0;

    size_t parts() const { return points.size() - 1; }
    long long first(size_t part) const { return points[part]; }
    long long lead(size_t part) const { return first(part) < leadIn ? first(part) : leadIn; }
    long long frames(size_t part) const { return points[part + 1] - points[part]; }
};

// The module that records the encoders' units of a part in a file, for the multiplexer of the film. "" if the
// output is no film: then its parts are plain files.
std::string recorderOf(const JobPlan& plan);
inline bool isFilm(const JobPlan& plan) { return !recorderOf(plan).empty(); }

// Whether the encoder codes each picture independently, so that its bytes do not depend on where its part
// begins.
bool isCodedAlone(const PlannedStream& picture);

// The first video stream. The plan has to have one.
const PlannedStream& pictureOf(const JobPlan& plan);

// Parts begin at multiples of this number of output frames. At those a frame of the input begins, and a
// sample of each sound of the output.
long long splitUnit(const JobPlan& plan);

// How parts share a machine with this number of cores. `threads`: of each part, `processors`: of the whole
// job, as the user gave them; 0: not given.
struct PartShare {
    int atOnce;   // parts that run at the same time
    int threads;  // of each
};
PartShare shareOf(size_t parts, int cores, int threads, int processors);

// Divides at such multiples into parts that are as equal as possible; fewer than `parts` if there are too few
// multiples. Throws Failure for a job whose parts would differ from the same frames of the job in one piece;
// the message names the filter or output that is the reason.
SplitPlan planSplit(const JobPlan& plan, int parts);
