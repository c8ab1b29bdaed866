#include "tarsel/job/plan/lengths.h"

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

void setSamples(const JobPlan& plan, PlannedStream& stream, const PlannedStream* picture) {
    const int samplerate = stream.sound.samplerate;
    stream.own =
        QvSampleRange(stream.part.in, stream.part.out, plan.source(stream).sound.samplerate, samplerate).out;
    stream.expected = stream.own;
    if (!picture) return;
    const auto samplesOf = [&](long long frames) {
        return QvUtil::samplesForFrames(static_cast<int>(frames), picture->picture.rate, samplerate);
    };
    stream.expected = samplesOf(picture->expected);
    stream.frame = samplesOf(1) + 1;
}

}  // namespace

void planLengths(JobPlan& plan) {
    const PlannedStream* picture = nullptr;
    for (PlannedStream& stream : plan.streams) {
        if (!stream.isVideo()) continue;
        setFrames(plan, stream);
        picture = &stream;
    }
    for (PlannedStream& stream : plan.streams)
        if (!stream.isVideo()) setSamples(plan, stream, picture);
}
