#include "tarsel/job/plan/lengths.h"

#include <algorithm>

#include "tarsel/job/plan/jobplan.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

void setFrames(const JobPlan& plan, PlannedStream& stream) {
    const StreamPart& part = stream.part;
    const QvFramerate& rate = plan.source(stream).picture.rate;
    QvFrameRange range(part.in, part.out, rate);
    if (!range.empty()) range.convert(rate, stream.picture.rate);
    if (range.out < 1)
        throw failure(Msg::noFrameBetween, {plan.input(stream).name, formatTime(part.in.seconds()),
                                            formatTime(part.out.seconds())});
    stream.expected = range.out;
}

// As the audio link does: sound that comes earlier starts later in its input.
long long ownSamples(const JobPlan& plan, const PlannedStream& stream) {
    const InputStream& source = plan.source(stream);
    const auto moved = [&](const MediaTime& point) {
        const MediaTime later = point + stream.skipped, end = source.end();
        return later < end ? later : end;
    };
    const StreamPart& part = stream.part;
    return QvSampleRange(moved(part.in), moved(part.out), source.sound.samplerate, stream.sound.samplerate)
        .out;
}

}  // namespace

void planFrames(JobPlan& plan) {
    for (PlannedStream& stream : plan.streams)
        if (stream.isVideo()) setFrames(plan, stream);
}

void planSamples(JobPlan& plan) {
    const auto last = std::find_if(plan.streams.rbegin(), plan.streams.rend(),
                                   [](const PlannedStream& s) { return s.isVideo(); });
    for (PlannedStream& stream : plan.streams) {
        if (stream.isVideo()) continue;
        stream.expected = stream.own = ownSamples(plan, stream);
        if (last == plan.streams.rend()) continue;
        const auto samplesOf = [&](long long frames) {
            return QvUtil::samplesForFrames(static_cast<int>(frames), last->picture.rate,
                                            stream.sound.samplerate);
        };
        stream.expected = samplesOf(last->expected);
        stream.frame = samplesOf(1) + 1;
    }
}
