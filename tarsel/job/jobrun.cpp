#include "tarsel/job/jobrun.h"

#include <algorithm>
#include <new>
#include <optional>

#include "tarsel/host/events.h"
#include "tarsel/host/keyboard.h"
#include "tarsel/host/memory.h"
#include "tarsel/host/terminal.h"
#include "tarsel/job/post.h"
#include "tarsel/job/resultcheck.h"
#include "tarsel/job/runfailure.h"
#include "tarsel/job/savedtask.h"
#include "tarsel/words/fixedline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

// What is said when the process ends at once.
std::optional<Msg> lastWordOf(const OutputForm& output) {
    if (!output.isStream()) return std::nullopt;
    return Msg::stoppedWithPart;
}

}  // namespace

namespace {

void boundThreads(QvCodec& codec, int threads) {
    try {
        codec.setParam("threads", threads);
    } catch (const QvParamException&) {  // it works in one
    }
}

}  // namespace

JobRun::JobRun(const JobOptions& options, JobParts& parts, const InputLengths& lengths, Warnings& warnings,
               Signals& signals)
    : options_(options),
      parts_(parts),
      plan_(parts.plan),
      lengths_(lengths),
      warnings_(warnings),
      signals_(signals),
      progress_(options.progress, options.quiet, "task 1 of 1  ") {}

void JobRun::run() {
    // What has begun to take its place is neither left half-way nor taken back.
    const Signals::Watch placing(signals_, {.first = [](int) {},
                                            .second = [this] { return parts_.outputs.leave(); },
                                            .last = lastWordOf(plan_.output),
                                            .file = plan_.output.name});
    checkSpace();
    saveTask(parts_, options_, signals_);
    if (options_.division)
        divide();
    else
        transcode(beginFilters());
    const std::vector<std::string> names = parts_.outputs.names();
    Events::get().wrote(names);
    if (options_.post.empty()) signals_.complete();
    // The result is complete, so a lack of memory for these lines is no failure.
    try {
        if (!options_.quiet) warnings_.show();
        if (!options_.quiet)
            for (const auto& line : plan_.notes) tell(Level::note, line);
        if (!options_.quiet) report(names);
    } catch (const std::bad_alloc&) {
        writeToStderr(FixedLine(Msg::doneUnsaid).text());
    }
    if (!options_.post.empty()) {
        const bool noOutput = parts_.outputs.stream() && parts_.outputs.stream()->isStandardOutput();
        runPost({options_.post, options_.inputs, names, plan_.output.name, noOutput}, signals_);
    }
    signals_.complete();
}

void JobRun::checkSpace() const {
    const long long space = parts_.outputs.freeSpace();
    const long long whole = plan_.output.kind == OutputKind::pictures ? 0 : plan_.bytes();
    const long long need = options_.division ? 2 * whole : whole;  // of the parts, and of what they become
    if (space >= 0 && need > space)
        throw failure(Msg::outputNoSpace, {plan_.output.name, formatBytes(need), formatBytes(space)});
}

// What filters write is an output like the others: it gets its name when the job is complete.
std::vector<ProcessParams> JobRun::beginFilters() {
    std::vector<ProcessParams> all;
    for (const PlannedStream& stream : plan_.streams) {
        ProcessParams params = stream.params();
        if (stream.isVideo() && !stream.filters.empty())
            params.setFilters(parts_.outputs.begun(stream.filters));
        all.push_back(params);
    }
    return all;
}

// Until the results have their names, a signal stops the transcoder.
void JobRun::transcode(const std::vector<ProcessParams>& params) {
    const MemoryWatch memory;
    JobTranscoder transcoder(parts_, progress_);
    if (options_.measuredFor >= 0) transcoder.countMeasuring();
    const Signals::Watch running(signals_, {.first = [&](int) { transcoder.requestStop(); },
                                            .second = [this] { return parts_.outputs.leave(); },
                                            .report = [&] { transcoder.report(); },
                                            .suspend = [this] { progress_.time().stopping(); },
                                            .resume = [this] { progress_.time().continued(); },
                                            .last = lastWordOf(plan_.output),
                                            .file = plan_.output.name});
    try {
        transcoder.join(params);
        drive(transcoder);
    } catch (...) {
        stopIfSignalled();
        lengths_.check(!plan_.output.isStream());
        throwBetter(memory.ranOut(), plan_.output.name);
    }
    checkAndCommit();
}

// The parts are runs of their own; here they are waited for and put together.
void JobRun::divide() {
    JobDivision& division = *options_.division;
    const Signals::Watch running(signals_, {.first = [&](int) { division.requestStop(); },
                                            .second = [this] { return parts_.outputs.leave(); },
                                            .report = [&] { progress_.report(division.now()); },
                                            .suspend =
                                                [&] {
                                                    progress_.time().stopping();
                                                    division.pause(true);
                                                },
                                            .resume =
                                                [&] {
                                                    division.pause(false);
                                                    progress_.time().continued();
                                                },
                                            .file = plan_.output.name});
    AnyDict task = storedState(parts_, options_);
    const std::string output = parts_.outputs.begin();
    progress_.start(division.now());
    {
        bool paused = false;
        Keyboard keyboard(progress_.onTerminal(), [&](char key) {
            if (key == 'q') Signals::interrupt();
            if (key == '?') progress_.say(kKeyHelp);
            if (key != 'p') return;
            paused = !paused;
            paused ? progress_.time().pause() : progress_.time().resume();
            division.pause(paused);
            progress_.show(division.now());
        });
        written_ = division.run({options_, parts_, std::move(task), output, progress_, warnings_});
    }
    ProgressState end = division.now();
    end.state = written_.empty() ? "stopped" : "done";
    progress_.finish(end);
    stopIfSignalled();
    checkAndCommit();
}

void JobRun::drive(JobTranscoder& transcoder) {
    const int result = start(transcoder);
    ProgressState end = transcoder.last();
    end.state = signals_.received() != Exit::done ? "stopped" : result == 0 ? "done" : "failed";
    progress_.finish(end);
    stopIfSignalled();
    if (result != 0 && result != QvStatus::endOfStream) throwRunFailure(parts_, transcoder, result);
    if (transcoder.filterFailure()) throw *transcoder.filterFailure();
    written_ = transcoder.written();
    endedEarly_ = transcoder.endedEarly();
    addClipped(transcoder.clipped());
}

void JobRun::addClipped(const std::vector<long long>& clipped) {
    for (size_t i = 0; i < clipped.size(); ++i)
        if (clipped[i] > 0)
            warnings_.add(lineOf(Msg::soundClipped, {std::to_string(plan_.streams[i].number),
                                                     plan_.output.name, std::to_string(clipped[i])}));
}

// Of this run only: a task file does not keep it.
void JobRun::boundThreads() const {
    if (options_.threads == 0) return;
    for (const auto& source : parts_.sources) ::boundThreads(source->decoder(), options_.threads);
    for (const PlannedStream& stream : plan_.streams)
        if (QvEncoder* const encoder = parts_.pipe->encoder(stream.type, stream.number))
            ::boundThreads(*encoder, options_.threads);
}

// The result of the whole run.
int JobRun::start(JobTranscoder& transcoder) {
    if (const std::string name = parts_.outputs.begin(); !name.empty())
        parts_.pipe->setFilename(Any(name.c_str()));
    progress_.start(transcoder.begin(), std::max(options_.measuredFor, 0.0));
    addEngineWarnings();  // of joining the streams
    boundThreads();
    stopIfSignalled();
    const int result = transcoder.transcode(false);
    // So it stays only where no worker could be started.
    if (result == QvStatus::failed && transcoder.isTranscoding())
        throw failure(Msg::runHasNoThread, {plan_.output.name});
    if (result != QvStatus::ok && result != QvStatus::warning) return result;
    Keyboard keyboard(progress_.onTerminal(), [&](char key) { transcoder.pressed(key); });
    return transcoder.wait([this] {
        if (!options_.quiet) tell(Level::note, lineOf(Msg::stopping));
    });
}

void JobRun::addEngineWarnings() {
    warnings_.addEngine([this](const std::string& text) { return parts_.outputs.withFinalNames(text); });
}

void JobRun::checkAndCommit() {
    lengths_.check(!plan_.output.isStream());
    addEngineWarnings();
    for (const auto& source : parts_.sources)
        if (const std::string text = source->concealed(); !text.empty())
            warnings_.add(lineOf(Msg::filmConcealed, {source->name(), text}));
    if (const std::string lost = Events::get().lost(); !lost.empty()) warnings_.add(lost);
    if (endedEarly_) {
        const std::string& name = plan_.input(*endedEarly_).name;
        if (!options_.acceptPartial) throw failure(Msg::soundEndedEarly, {name});
        warnings_.add(lineOf(Msg::soundPartlyRead, {name}));
    }
    checkResult(parts_, written_, options_.acceptPartial, warnings_);
    stopIfSignalled();
    if (options_.strict) warnings_.refuse(options_.quiet, plan_.output.name);
    if (options_.unchanged) lengths_.checkUnchanged();
    parts_.outputs.commit();
}

void JobRun::stopIfSignalled() const {
    const Exit signalled = signals_.received();
    if (signalled == Exit::done) return;
    const bool part = plan_.output.isStream() && parts_.taken() > 0;
    throw Failure(signalled,
                  part ? lineOf(Msg::stoppedWithPart, {plan_.output.name}) : lineOf(Msg::stoppedWithNothing));
}

void JobRun::report(const std::vector<std::string>& names) const {
    std::string line = "wrote " + (names.empty() ? "nothing" : inQuotes(names.front()));
    if (names.size() == 2) line += " and " + inQuotes(names[1]);
    if (names.size() > 2) line += " and " + std::to_string(names.size() - 1) + " more files";
    for (size_t i = 0; i < written_.size(); ++i)
        line += ", " + std::to_string(written_[i]) + (plan_.streams[i].isVideo() ? " frame" : " sample") +
                (written_[i] == 1 ? "" : "s");
    if (const std::size_t warnings = warnings_.count(); warnings > 0)
        line += " (" + std::to_string(warnings) + (warnings == 1 ? " warning)" : " warnings)");
    tell(Level::note, line);
}
