#include "tarsel/job/plan/lengths.h"

#include <cmath>

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

// As the engine's audio link counts them. Sound that is to come earlier is read from a later point of its
// input.
long long ownSamples(const JobPlan& plan, const PlannedStream& stream) {
    const InputStream& source = plan.source(stream);
    const auto moved = [&](const MediaTime& point) {
        if (stream.skipped <= MediaTime()) return point;
        const MediaTime later = point + stream.skipped, end = source.end();
        return later < end ? later : end;
    };
    const StreamPart& part = stream.part;
    return QvSampleRange(moved(part.in), moved(part.out + stream.delayed), source.sound.samplerate,
                         stream.sound.samplerate)
        .out;
}

MediaTime ownLength(const JobPlan& plan, const PlannedStream& stream) {
    return qvInstantOf(ownSamples(plan, stream), QvRatio(stream.sound.samplerate, 1));
}

// The sound that ends first, or last; null without one.
const PlannedStream* soundEnding(const JobPlan& plan, bool first) {
    const PlannedStream* found = nullptr;
    for (const PlannedStream& stream : plan.streams) {
        if (stream.isVideo()) continue;
        if (!found || (first ? ownLength(plan, stream) < ownLength(plan, *found)
                             : ownLength(plan, *found) < ownLength(plan, stream)))
            found = &stream;
    }
    return found;
}

void endWith(const JobPlan& plan, const PlannedStream& sound, PlannedStream& video) {
    const QvFramerate& rate = plan.source(video).picture.rate;
    StreamPart& part = video.part;
    const MediaTime end = part.in + ownLength(plan, sound);
    if (part.out <= end) return;
    if (end.position(rate) <= part.in.position(rate))
        throw failure(Msg::soundEndsFirst, {plan.input(sound).name});
    part.out = end;
    part.whole = false;
}

// Repeats the last picture up to the end of the frame in which the sound ends.
void holdFor(const JobPlan& plan, const PlannedStream& sound, PlannedStream& video) {
    const QvFramerate& rate = plan.source(video).picture.rate;
    StreamPart& part = video.part;
    MediaTime end = part.in + ownLength(plan, sound);
    const long long frames = end.position(rate);
    end = qvInstantOf(qvInstantOf(frames, rate.rate()) < end ? frames + 1 : frames, rate.rate());
    if (end <= part.out) return;
    part.out = end;
    part.whole = false;
    video.hold = true;
}

// Notes that the sound is cut or filled up at the end of the picture. If both are of one input, or the user
// gave points, less than a frame is not worth a note.
void noteEnd(JobPlan& plan, const PlannedStream& stream, const PlannedStream& picture) {
    const double rate = stream.sound.samplerate;
    const double own = static_cast<double>(stream.own) / rate,
                 shown = static_cast<double>(stream.expected) / rate;
    constexpr double least = 0.000999;  // seconds; a thousandth is shown
    const bool chosen = stream.part.whole && stream.part.input != picture.part.input;
    const double apart = chosen ? least : 1 / static_cast<double>(picture.picture.rate.rate());
    if (std::abs(own - shown) < apart) return;
    plan.notes.push_back(lineOf(own > shown ? Msg::soundCut : Msg::soundFilled,
                                {plan.input(stream).name, formatTime(own), formatTime(shown)}));
}

}  // namespace

void planEnds(JobPlan& plan, bool shortest, bool longest) {
    if (!shortest && !longest) return;
    const PlannedStream* sound = soundEnding(plan, shortest);
    if (!sound || !plan.hasVideo()) throw failure(Msg::endsNoSound, {shortest ? "--shortest" : "--longest"});
    for (PlannedStream& stream : plan.streams) {
        if (!stream.isVideo()) continue;
        shortest ? endWith(plan, *sound, stream) : holdFor(plan, *sound, stream);
    }
}

void planFrames(JobPlan& plan) {
    for (PlannedStream& stream : plan.streams)
        if (stream.isVideo()) setFrames(plan, stream);
}

void planSamples(JobPlan& plan) {
    const PlannedStream* const last = plan.lastVideo();
    for (PlannedStream& stream : plan.streams) {
        if (stream.isVideo()) continue;
        stream.expected = stream.own = ownSamples(plan, stream);
        if (!last) continue;
        stream.expected = QvUtil::samplesForFrames(static_cast<int>(last->expected), last->picture.rate,
                                                   stream.sound.samplerate);
        noteEnd(plan, stream, *last);
    }
}
