#include "tarsel/batch/runner.h"

#include <algorithm>
#include <cstdio>

#include "tarsel/batch/journal.h"
#include "tarsel/batch/taskrun.h"
#include "tarsel/host/clock.h"
#include "tarsel/host/events.h"
#include "tarsel/host/keyboard.h"
#include "tarsel/host/outputs/recordfile.h"
#include "tarsel/host/taskevent.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr int kTick = 200;                // ms between two looks at the clock
constexpr double kPatience = 10;          // seconds that a task which was stopped for its time has to end
constexpr int kLastPatience = 2000;       // ms that all have at a second signal
constexpr double kLeastWeight = 1 << 20;  // bytes: a task costs something whatever it reads
constexpr int kSignalStatus = 128;

std::string secondsText(double seconds) {
    const std::string text = formatTime(seconds);
    return text.substr(0, text.size() - 2);  // tenths
}

}  // namespace

BatchRunner::BatchRunner(const BatchFile& file, const BatchOptions& options, Signals& signals)
    : file_(file), options_(options), signals_(signals), progress_(options.progress, options.quiet, "") {}

void BatchRunner::prepare() {
    list_ = file_.load();
    std::vector<BatchTask> tasks = file_.tasksOf(list_);
    if (tasks.empty()) throw failure(Msg::batchEmpty, {file_.shown()});
    order_ = orderOf(tasks);
    entries_.resize(tasks.size());
    for (size_t i = 0; i < tasks.size(); ++i) {
        Entry& entry = entries_[i];
        entry.result.number = tasks[i].number;
        entry.result.id = tasks[i].id;
        entry.result.inputs = tasks[i].inputs;
        entry.result.output = tasks[i].output;
        if (!tasks[i].enabled) {
            entry.result.end = TaskEnd::disabled;
            entry.ended = true;
        } else {
            entry.weight = kLeastWeight;
            for (const std::string& input : tasks[i].inputs)
                if (const auto stamp = stampOf(input)) entry.weight += static_cast<double>(stamp->bytes);
            wholeWeight_ += entry.weight;
        }
        entry.task = std::move(tasks[i]);
    }
}

BatchResult BatchRunner::run() {
    prepare();
    const NamedLock lock(file_.runLock(), file_.shown());
    start_ = secondsSince1970();
    const Signals::Watch watch(signals_, {.first = [this](int) { stopAll(); },
                                          .second = [this] { return endAtOnce(); },
                                          .report = [this] { bell_.ring(); },
                                          .suspend = [this] { suspended_ = setPaused(true); },
                                          .resume =
                                              [this] {
                                                  if (suspended_.exchange(false)) setPaused(false);
                                              },
                                          .last = Msg::stopped});
    Keyboard keyboard(progress_.onTerminal(), [this](char key) { pressed(key); });
    progress_.start();
    for (begin(); running() > 0; begin()) {
        std::vector<int> handles = {bell_.descriptor()};
        for (const Entry& entry : entries_)
            if (entry.child) handles.push_back(entry.child->process().descriptor());
        waitForAny(handles, kTick);
        bell_.silence();
        listen();
        show();
    }
    return result();
}

int BatchRunner::running() const {
    return static_cast<int>(std::count_if(entries_.begin() + static_cast<std::ptrdiff_t>(first_),
                                          entries_.end(),
                                          [](const Entry& entry) { return entry.child != nullptr; }));
}

// --- Beginning.

// Whether it can begin now. One whose input was not made has failed.
bool BatchRunner::isDue(const Entry& entry, size_t index) {
    for (const Before& before : order_[index]) {
        const Entry& other = entries_[before.task];
        if (!other.ended) return false;
        const bool made = other.result.end == TaskEnd::done || other.result.end == TaskEnd::already;
        if (!before.gives || made) continue;
        if (other.result.end == TaskEnd::failed)
            fail(entries_[index], -1,
                 lineOf(Msg::batchInputFailed, {entry.task.output, std::to_string(other.task.number)}));
        return false;
    }
    return true;
}

void BatchRunner::begin() {
    while (first_ < entries_.size() && entries_[first_].ended) ++first_;
    int now = running();
    for (size_t i = first_; i < entries_.size() && now < options_.jobs; ++i) {
        if (stopping_ || (failed_ && options_.stopOnError)) return;
        Entry& entry = entries_[i];
        if (entry.ended || entry.child || !isDue(entry, i)) continue;
        start(entry);
        if (entry.child) ++now;
    }
}

void BatchRunner::start(Entry& entry) {
    const TaskRecord record = TaskRecord::read(file_.journal(entry.task.id));
    if (record.isDone(keyOf(entry.task), options_.verify)) {
        for (const RecordedFile& file : record.files) entry.result.written.push_back(file.name);
        entry.result.start = record.start;
        entry.result.seconds = record.seconds;
        return end(entry, TaskEnd::already);
    }
    startChild(entry);
}

void BatchRunner::startChild(Entry& entry) {
    std::vector<std::string> words;
    if (!options_.log.empty()) words = {"--log", options_.log + "." + entry.task.id};
    words.insert(words.end(), options_.command.begin(), options_.command.end());
    words.push_back(std::to_string(entry.task.number));
    ++entry.result.attempts;
    entry.result.start = secondsSince1970();
    entry.timedOut = entry.killed = false;
    try {
        const Descriptor task = BatchFile::handOver(list_, {static_cast<size_t>(entry.task.number) - 1});
        const std::lock_guard guard(lock_);
        entry.child = std::make_unique<ChildTask>(words, task);
        // A pause is one within the task, wherever it came.
        if (paused_) {
            entry.child->time().pause();
            entry.child->process().pause();
        }
        if (stopping_) entry.child->process().askToEnd();
    } catch (const Failure& failed) {
        fail(entry, static_cast<int>(failed.exit()), failed.what());
    }
}

// --- While they run.

void BatchRunner::listen() {
    for (size_t i = first_; i < entries_.size(); ++i) {
        Entry& entry = entries_[i];
        if (!entry.child) continue;
        entry.child->time().tick();
        const bool open = entry.child->readProgress();
        for (const std::string& warning : entry.child->takeWarnings()) {
            entry.result.warnings.push_back(warning);
            if (!options_.quiet) say("task " + std::to_string(entry.task.number) + ": warning: " + warning);
        }
        if (!open)
            collect(entry);
        else
            limit(entry);
    }
}

void BatchRunner::limit(Entry& entry) {
    const double over = options_.timeout < 0 ? -1 : entry.child->time().seconds() - options_.timeout;
    if (over > 0 && !entry.timedOut) {
        entry.timedOut = true;
        entry.child->process().askToEnd();
    }
    if (over > kPatience && !entry.killed) {
        entry.killed = true;
        entry.child->process().kill();
    }
}

void BatchRunner::collect(Entry& entry) {
    std::unique_ptr<ChildTask> child;
    BatchTaskResult& result = entry.result;
    const int ended = entry.child->process().wait();
    const bool killed = ended < 0;
    result.status = killed ? kSignalStatus - ended : ended;
    {
        const std::lock_guard guard(lock_);
        child = std::move(entry.child);
    }
    result.seconds = child->time().seconds();
    result.speed = child->speed();
    endedFrames_ += child->frames();
    endedSeconds_ += child->outSeconds();
    if (result.status == 0) {
        result.written = child->outputs();
        return end(entry, TaskEnd::done);
    }
    if (killed) tidyAfter(entry.task, options_.policy);
    if (stopping_) return end(entry, TaskEnd::stopped);
    const std::string& output = entry.task.output;
    std::string line = child->failure();
    if (entry.timedOut)
        line = lineOf(Msg::batchTaskTimeout, {output, options_.timeoutText});
    else if (killed)
        line = lineOf(Msg::batchTaskKilled, {output, std::to_string(-ended), entry.task.id});
    else if (line.empty())
        line = lineOf(Msg::batchTaskFailed, {output, std::to_string(result.status), entry.task.id});
    if (result.attempts > options_.retries) return fail(entry, result.status, line);
    say("task " + std::to_string(entry.task.number) + " is tried again: " + line);
    startChild(entry);
}

void BatchRunner::fail(Entry& entry, int status, const std::string& line) {
    entry.result.status = status;
    entry.result.failure = line;
    failed_ = true;
    end(entry, TaskEnd::failed);
}

void BatchRunner::end(Entry& entry, TaskEnd how) {
    entry.ended = true;
    entry.result.end = how;
    endedWeight_ += entry.weight;
    report(entry, how == TaskEnd::done      ? "done"
                  : how == TaskEnd::already ? "already"
                  : how == TaskEnd::failed  ? "failed"
                                            : "stopped");
    if (how == TaskEnd::stopped || (options_.quiet && how != TaskEnd::failed)) return;
    std::string line = "task " + std::to_string(entry.task.number) + " of " + std::to_string(entries_.size());
    if (how == TaskEnd::failed) return say(line + " failed: " + entry.result.failure);
    line += how == TaskEnd::already ? " was done before: " : " is done: ";
    line += entry.task.output.empty() ? "nothing" : inQuotes(entry.task.output);
    if (how == TaskEnd::done) {
        line += ", " + secondsText(entry.result.seconds);
        char speed[32];
        std::snprintf(speed, sizeof speed, ", %.1fx", entry.result.speed);
        if (entry.result.speed > 0) line += speed;
    }
    if (const size_t count = entry.result.warnings.size(); count > 0)
        line += " (" + std::to_string(count) + (count == 1 ? " warning)" : " warnings)");
    say(line);
}

// --- What is shown.

void BatchRunner::say(const std::string& line) {
    if (progress_.onTerminal())
        progress_.say("tarsel: " + line);
    else
        tell(Level::note, line);
}

void BatchRunner::show() {
    ProgressState state;
    double weight = endedWeight_;
    state.frame = endedFrames_;
    state.outSeconds = endedSeconds_;
    size_t ended = 0;
    for (const Entry& entry : entries_) {
        ended += entry.ended ? 1 : 0;
        if (!entry.child) continue;
        weight += entry.weight * entry.child->done();
        state.frame += entry.child->frames();
        state.outSeconds += entry.child->outSeconds();
    }
    if (progress_.due())
        for (const Entry& entry : entries_)
            if (entry.child) report(entry, paused_ ? "paused" : "running");
    state.part = wholeWeight_ > 0 ? weight / wholeWeight_ : 1;
    state.state = paused_ ? "paused" : "running";
    progress_.setLabel(std::to_string(ended) + " of " + std::to_string(entries_.size()) + " tasks  ");
    progress_.update(state);
}

// Of a task that is at work, or of one that has ended.
void BatchRunner::report(const Entry& entry, const char* state) const {
    if (options_.progress.how != ProgressMode::How::json) return;
    const BatchTaskResult& result = entry.result;
    TaskEvent event;
    event.number = entry.task.number;
    event.count = static_cast<int>(entries_.size());
    event.id = result.id;
    event.attempt = result.attempts;
    JobFigures& figures = event.figures;
    figures.state = state;
    if (entry.child) {
        const ChildTask& child = *entry.child;
        figures.percent = child.done() * 100;
        figures.frame = child.frames();
        figures.outMicroseconds = static_cast<long long>(child.outSeconds() * 1e6);
        figures.speed = child.speed();
        figures.elapsedSeconds = entry.child->time().seconds();
        if (child.done() > 0) figures.etaSeconds = figures.elapsedSeconds * (1 - child.done()) / child.done();
        if (figures.elapsedSeconds > 0)
            figures.fps = static_cast<double>(child.frames()) / figures.elapsedSeconds;
    } else {
        const bool made = result.end == TaskEnd::done || result.end == TaskEnd::already;
        figures.percent = made ? 100 : -1;
        figures.etaSeconds = made ? 0 : -1;
        figures.speed = result.speed;
        figures.elapsedSeconds = result.seconds;
        event.status = made ? 0 : std::max(result.status, 1);
        event.failure = result.failure;
        event.outputs = result.written;
    }
    tellTask(event);
}

// --- Signals and keys, on threads of their own.

void BatchRunner::stopAll() {
    stopping_ = true;
    const std::lock_guard guard(lock_);
    for (const Entry& entry : entries_)
        if (entry.child) entry.child->process().askToEnd();
    bell_.ring();
}

// A second signal makes them end at once as well, which takes a moment. Nothing of them is left then.
bool BatchRunner::endAtOnce() {
    stopAll();
    const std::lock_guard guard(lock_);
    for (const Entry& entry : entries_)
        if (entry.child && !entry.child->process().endsWithin(kLastPatience)) entry.child->process().kill();
    return false;
}

bool BatchRunner::setPaused(bool paused) {
    const std::lock_guard guard(lock_);
    if (paused_.exchange(paused) == paused) return false;
    paused ? progress_.time().pause() : progress_.time().resume();
    for (const Entry& entry : entries_)
        if (entry.child) {
            paused ? entry.child->time().pause() : entry.child->time().resume();
            paused ? entry.child->process().pause() : entry.child->process().resume();
        }
    bell_.ring();
    return true;
}

void BatchRunner::pressed(char key) {
    if (key == 'p') setPaused(!paused_);
    if (key == 'q') Signals::interrupt();
}

// --- The end.

BatchResult BatchRunner::result() {
    BatchResult result;
    result.list = file_.name();
    result.start = start_;
    result.seconds = progress_.time().seconds();
    ProgressState last;
    last.part = wholeWeight_ > 0 ? endedWeight_ / wholeWeight_ : 1;
    last.frame = endedFrames_;
    last.outSeconds = endedSeconds_;
    const Exit signalled = signals_.received();
    last.state = signalled != Exit::done ? "stopped" : failed_ ? "failed" : "done";
    progress_.finish(last);
    result.status = static_cast<int>(signalled != Exit::done ? signalled
                                     : failed_               ? Exit::failed
                                                             : Exit::done);
    for (Entry& entry : entries_) result.tasks.push_back(std::move(entry.result));
    return result;
}
