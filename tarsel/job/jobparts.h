// A plan with the objects that carry it out.
#pragma once

#include <memory>
#include <vector>

#include "tarsel/job/joboutputs.h"
#include "tarsel/job/plan/jobplan.h"
#include "tarsel/job/task/storedtask.h"
#include "tarsel/source/source.h"

struct JobParts {
    JobPlan plan;
    std::vector<std::unique_ptr<Source>> sources;  // the inputs of the plan, open
    JobOutputs outputs;
    std::unique_ptr<QvEncodePipe> pipe;  // set up as the plan says
    std::unique_ptr<StoredTask> stored;  // what the plan was made of; null for a job of the command line

    Source& source(const PlannedStream& stream) const {
        return *sources[static_cast<size_t>(stream.part.input)];
    }
    QvEncoder* encoder(const PlannedStream& stream) const {
        return pipe->encoder(stream.type, stream.number);
    }
    // What the multiplexer writes a stream to; null without one.
    QvBufStream* file(const PlannedStream& stream) const {
        return pipe->getMuxer()->stream(stream.type, stream.number);
    }
    // Bytes that an output which takes one stream has taken.
    long long taken() const { return static_cast<long long>(file(plan.streams.front())->ioTaken()); }
};
