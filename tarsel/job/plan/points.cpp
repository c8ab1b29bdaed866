#include "tarsel/job/plan/points.h"

#include "tarsel/job/plan/jobplan.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

class Points {
  public:
    Points(JobPlan& plan, const PointOptions& options)
        : plan_(plan), options_(options), leading_(leadingOf(plan)), whole_(plan.source(leading_).end()) {}

    void set(PlannedStream& stream) {
        const JobInput& input = plan_.input(stream);
        const MediaTime length = plan_.source(stream).end();
        StreamPart& part = stream.part;
        part.whole = options_.from.empty() && options_.to.empty() && options_.duration.empty();
        part.in = MediaTime();
        part.out = length;
        parse(part, rateFor(input));
        const bool follows = !stream.isVideo() && plan_.hasVideo();
        check(part, input, length, follows);
        if (part.in > length) part.in = length;
        if (part.out <= length) return;
        if (!follows) warn(input, length);
        part.out = length;
    }

  private:
    static const PlannedStream& leadingOf(const JobPlan& plan) {
        const PlannedStream* const picture = plan.firstVideo();
        return picture ? *picture : plan.streams.front();
    }

    // For an input without a picture, times in frames count those of the output's picture.
    std::optional<QvFramerate> rateFor(const JobInput& input) const {
        const auto own = input.frameRate();
        return own || !leading_.isVideo() ? own : plan_.input(leading_).frameRate();
    }

    void parse(StreamPart& part, const std::optional<QvFramerate>& rate) const {
        if (!options_.from.empty()) part.in = parseInstant(options_.from, rate, from(), whole_);
        if (!options_.to.empty()) part.out = parseInstant(options_.to, rate, to(), whole_);
        if (!options_.duration.empty()) part.out = parseSpan(options_.duration, rate, "--duration", part.in);
    }

    // `follows`: a sound next to a picture; if it has ended before the part, it is silent.
    void check(const StreamPart& part, const JobInput& input, const MediaTime& length, bool follows) const {
        if (part.out <= part.in && !options_.to.empty())
            throw failure(Msg::toNotAfter, {to(), options_.to, start()});
        if (part.out <= part.in && !options_.duration.empty())
            throw failure(Msg::durationNone, {options_.duration});
        if (part.in >= length && !options_.from.empty() && !follows)
            throw failure(Msg::fromAfterEnd,
                          {from(), options_.from, input.name, formatTime(length.seconds())});
    }

    void warn(const JobInput& input, const MediaTime& length) {
        const std::string end = formatTime(length.seconds());
        plan_.warnings.push_back(
            options_.to.empty() ? lineOf(Msg::durationAfterEnd, {options_.duration, start(), input.name, end})
                                : lineOf(Msg::toAfterEnd, {to(), options_.to, input.name, end}));
    }

    std::string named(const char* option, const char* ofSegment) const {
        return options_.segment.empty() ? option : options_.segment + ": " + ofSegment;
    }
    std::string from() const { return named("--from", "from"); }
    std::string to() const { return named("--to", "to"); }
    std::string start() const {
        if (options_.from.empty()) return "the start";
        return options_.segment.empty() ? "--from " + options_.from : options_.from;
    }

    JobPlan& plan_;
    const PointOptions& options_;
    const PlannedStream& leading_;
    MediaTime whole_;  // the end of the leading stream
};

}  // namespace

void planPoints(JobPlan& plan, const PointOptions& options) {
    Points points(plan, options);
    for (PlannedStream& stream : plan.streams) points.set(stream);
}
