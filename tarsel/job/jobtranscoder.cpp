#include "tarsel/job/jobtranscoder.h"

#include <algorithm>

#include "tarsel/host/signals.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/systemcause.h"

namespace {

constexpr auto kSlowStop = std::chrono::seconds(1);
constexpr int kErrorLine = 2;  // type of a message of the engine

// All that narrow the samples of a link.
long long clippedBy(const TransLink& link) {
    long long clipped = 0;
    for (int i = 0; const QvCodec* filter = link.filter("aquant", i); ++i)
        if (const Any count = filter->getParam("clippedSamples"); count.isInt()) clipped += count.toInt64();
    return clipped;
}

}  // namespace

JobTranscoder::JobTranscoder(JobParts& parts, Progress& progress)
    : QvTranscoder(parts.stored ? &parts.stored->task() : nullptr),
      parts_(parts),
      progress_(progress),
      written_(parts.plan.streams.size(), -1),
      clipped_(parts.plan.streams.size(), 0) {}

void JobTranscoder::join(const std::vector<ProcessParams>& params) {
    setEncoder(parts_.pipe.get());
    setParam("startDelay", 0);
    const QvCodec& pipe = *parts_.pipe;
    twoPass_ = pipe.getParam("twoPass").isTrue() && pipe.getParam("twoPassPossible").isTrue();
    setParam("twoPass", twoPass_ ? 1 : 0);
    AnyDict reports;
    reports.set(twoPass_ ? "each" : "off", 1);
    setParam("progress", reports);
    for (size_t i = 0; i < params.size(); ++i) {
        const PlannedStream& s = parts_.plan.streams[i];
        if (parts_.stored)
            linkFor(s)->setProcessParams(params[i]);
        else if (link(&parts_.source(s).decoder(), s.type, s.part.stream, s.number, params[i]) < 0)
            throw failure(Msg::linkFailed, {parts_.plan.input(s).name});
    }
    first_ = linkOf(parts_.plan.streams.front());
}

int JobTranscoder::cbProcess() {
    if (stop_.load(std::memory_order_relaxed)) return 1;
    began_.store(true, std::memory_order_relaxed);
    if (analyzed_.load(std::memory_order_relaxed) >= 0) {
        if (progress_.due()) progress_.update(analyzingState());
        return 0;
    }
    if (first_) units_.store(first_->outProcessed(), std::memory_order_relaxed);
    if (progress_.due()) progress_.update(state("running"));
    return 0;
}

// The engine counts both passes as one whole.
int JobTranscoder::cbProgress(double part) {
    Any second;
    getParam("secondPass", second);
    analyzed_.store(second.isTrue() || !twoPass_ ? -1 : std::min(1.0, part * 2), std::memory_order_relaxed);
    return 0;
}

void JobTranscoder::cbMeasure(double part) {
    measured_.store(part, std::memory_order_relaxed);
    if (progress_.due()) progress_.update(measuringState());
}

// The counts have to be taken before the links close.
int JobTranscoder::cbMuxClose(QvMuxer*) {
    for (size_t i = 0; i < written_.size(); ++i)
        if (const TransLink* of = linkOf(parts_.plan.streams[i])) {
            written_[i] = of->outProcessed();
            clipped_[i] = clippedBy(*of);
        }
    for (const PlannedStream& stream : parts_.plan.streams)
        if (const TransLink* of = linkOf(stream); of && of->endedEarly() && !endedEarly_)
            endedEarly_ = &stream;
    takeFilterFailure();
    last_ = state("closing");
    phase_ = "closing";
    progress_.show(last_);
    return 0;
}

void JobTranscoder::cbPaused(bool paused) {
    paused ? progress_.time().pause() : progress_.time().resume();
    progress_.show(analyzed_ >= 0 ? analyzingState() : state(paused ? "paused" : "running"));
}

void JobTranscoder::cbDone(int result) {
    std::lock_guard guard(lock_);
    result_ = result;
    done_ = true;
    changed_.notify_all();
}

int JobTranscoder::wait(const std::function<void()>& slow) {
    std::unique_lock guard(lock_);
    changed_.wait(guard, [this] { return done_ || stop_; });
    if (!done_ && !changed_.wait_for(guard, kSlowStop, [this] { return done_; })) slow();
    changed_.wait(guard, [this] { return done_; });
    return result_;
}

void JobTranscoder::requestStop() {
    {
        std::lock_guard guard(lock_);
        stop_ = true;
        changed_.notify_all();
    }
    QvTranscoder::requestStop();
}

void JobTranscoder::pressed(char key) {
    if (key == 'p') isPaused() ? unpause() : pause();
    if (key == 'q') Signals::interrupt();
    if (key == '?') progress_.say(kKeyHelp);
}

void JobTranscoder::report() {
    if (measured_ >= 0 && !began_) return progress_.report(measuringState());
    progress_.report(analyzed_ >= 0 ? analyzingState()
                                    : stateAt(units_, isPaused() ? "paused" : phase_.load()));
}

ProgressState JobTranscoder::state(const char* name) const {
    if (!first_) return {.state = name};
    return stateAt(first_->outProcessed(), name);
}

ProgressState JobTranscoder::begin() const {
    ProgressState s{.part = 0, .state = "running"};
    countPasses(s, twoPass_ ? 1 : 0);
    return s;
}

// By the first stream.
ProgressState JobTranscoder::stateAt(long long units, const char* name) const {
    const PlannedStream& stream = parts_.plan.streams.front();
    ProgressState s;
    s.state = name;
    units = std::max(units, 0LL);
    if (stream.expected > 0)
        s.part = std::min(1.0, static_cast<double>(units) / static_cast<double>(stream.expected));
    const double rate =
        stream.isVideo() ? static_cast<double>(stream.picture.rate.rate()) : stream.sound.samplerate;
    s.outSeconds = static_cast<double>(units) / rate;
    if (stream.isVideo()) s.frame = units;
    countPasses(s, 0);
    return s;
}

ProgressState JobTranscoder::measuringState() const {
    ProgressState s{.part = measured_, .state = "running"};
    countPasses(s, twoPass_ ? 2 : 1);
    return s;
}

ProgressState JobTranscoder::analyzingState() const {
    ProgressState s{.part = analyzed_, .state = isPaused() ? "paused" : "running"};
    countPasses(s, 1);
    return s;
}

void JobTranscoder::countPasses(ProgressState& state, int fromLast) const {
    state.passes = 1 + (measured_ >= 0 ? 1 : 0) + (twoPass_ ? 1 : 0);
    state.pass = state.passes - fromLast;
    if (state.part >= 0) state.part = (state.part + state.pass - 1) / state.passes;
}

std::string JobTranscoder::reason() const {
    for (const PlannedStream& stream : parts_.plan.streams)
        if (const TransLink* of = linkOf(stream); of && of->errorCode() != 0 && *of->errorDesc())
            return of->errorDesc();
    AnyVector messages;
    qv_log()->getAll(messages);
    for (int i = 0; i < messages.size(); ++i)
        if (messages.at(i).asDict().getInt32("type", 0) == kErrorLine)
            return messages.at(i).asDict().getString("text", "");
    return *errorDesc() ? errorDesc() : "the engine gives no reason";
}

void JobTranscoder::takeFilterFailure() {
    for (const PlannedStream& stream : parts_.plan.streams) {
        const TransLink* of = linkOf(stream);
        if (!of || !stream.isVideo()) continue;
        for (const Any& name : stream.filters.names(true))
            for (int i = 0; const QvCodec* filter = of->filter(name.asString(""), i); ++i)
                if (filter->errorCode() != 0 && !filterFailure_) filterFailure_ = failureOf(*filter);
    }
}

Failure JobTranscoder::failureOf(const QvCodec& filter) const {
    const auto named = [this](const std::string& text) { return parts_.outputs.withFinalNames(text); };
    const std::string file = filterFile(filter, QV_GUI_FILESELECT_SAVE);
    const auto cause = causeIn(filter.errorDesc());
    if (!file.empty() && cause)
        return failure(Msg::filterWriteFailed, {filter.name(), named(file), cause->why, cause->remedy});
    return failure(Msg::filterFailed, {filter.name(), named(filter.errorDesc())});
}
