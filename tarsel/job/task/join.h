// Segments of inputs, one after the other, as the state of a task.
#pragma once

#include <string>
#include <vector>

#include "tarsel/job/plan/jobplan.h"

// A part of the output: what is read side by side, planned as a job of its own whose streams have the format
// of the output.
struct JoinedSegment {
    JobPlan plan;
    std::vector<int> inputs;  // of Join::inputs, for each of the plan
};

struct Join {
    std::vector<AnyDict> inputs;  // "filename" and "decoder" of each, once
    std::vector<JoinedSegment> segments;
    // All are parts of the same inputs: texts and timecodes are those of the inputs, and not of the output.
    bool ofCuts = false;

    // The streams of the output: those of the segments together, each in the format of the first segment that
    // has it.
    std::vector<PlannedStream> streams() const;
};

// `encoder`: the stored output. Where a segment lacks a stream, a generated one is black or silent.
AnyDict joinedState(const Join& join, const AnyDict& encoder, const std::string& output);
// One sound of the output alone, as far as the pictures go and without dither. It is not written anywhere.
AnyDict joinedSoundState(const Join& join, int sound, const AnyDict& encoder);
