#include "tarsel/job/job.h"

#include <algorithm>
#include <atomic>
#include <condition_variable>
#include <mutex>
#include <new>

#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/host/keyboard.h"
#include "tarsel/host/memory.h"
#include "tarsel/job/jobrun.h"
#include "tarsel/job/keptchunks.h"
#include "tarsel/job/outputpipe.h"
#include "tarsel/job/plan/inputfit.h"
#include "tarsel/job/savedtask.h"
#include "tarsel/job/task/joinplanner.h"
#include "tarsel/job/task/taskfilters.h"
#include "tarsel/job/task/taskplan.h"
#include "tarsel/job/task/tasktext.h"
#include "tarsel/sound/channelmap.h"
#include "tarsel/source/joinedsound.h"
#include "tarsel/words/messages.h"

namespace {

// The pass before the run, in which the sounds are measured. Keys and signals come on threads of their own.
class MeasuringPass {
  public:
    explicit MeasuringPass(const JobOptions& options)
        : progress(options.progress, options.quiet || options.dryRun, "task 1 of 1  ") {}

    ProgressState now() const {
        return {.part = part_ / 2, .pass = 1, .passes = 2, .state = paused_ ? "paused" : "running"};
    }
    // Shows how far the measuring is, and waits while it is paused. Whether there was no stop.
    bool goOn(double part) {
        part_ = part;
        if (progress.due()) progress.update(now());
        std::unique_lock hold(lock_);
        changed_.wait(hold, [this] { return !paused_ || stop_; });
        return !stop_;
    }
    void stop() {
        const std::lock_guard hold(lock_);
        stop_ = true;
        changed_.notify_all();
    }
    void pressed(char key) {
        if (key == 'q') Signals::interrupt();
        if (key == '?') progress.say(kKeyHelp);
        if (key != 'p') return;
        {
            const std::lock_guard hold(lock_);
            paused_ = !paused_;
            paused_ ? progress.time().pause() : progress.time().resume();
        }
        progress.show(now());
        changed_.notify_all();
    }

    Progress progress;

  private:
    std::atomic<double> part_{0};
    std::atomic<bool> paused_{false}, stop_{false};
    std::mutex lock_;
    std::condition_variable changed_;
};

}  // namespace

Job::Job(const JobOptions& options, Signals& signals)
    : options_(options),
      signals_(signals),
      parts_{{}, {}, JobOutputs(options_), nullptr, nullptr},
      warnings_(options.warnings) {
    if (options_.inputs.empty()) throw failure(Msg::inputMissing);
    if (options_.joins()) {
        joinInputs();
        return;
    }
    openInputs();
    joinSounds();
    if (fitsInputs(options_)) fitToInputs();
    begin(planJob(options_, parts_.outputs.form(), readInputs()));
}

Job::Job(const JobOptions& options, std::unique_ptr<StoredTask> task, Signals& signals)
    : options_(options),
      signals_(signals),
      parts_{{}, task->sources(), JobOutputs(options_), task->takePipe(), nullptr},
      warnings_(options.warnings) {
    parts_.stored = std::move(task);
    JobPlan plan = planTask(*parts_.stored, parts_.outputs.form(), readInputs(), options_.acceptPartial);
    plan.filterFiles.read = filesOfFilters(*parts_.stored);
    begin(std::move(plan));
}

void Job::begin(JobPlan plan) {
    parts_.plan = std::move(plan);
    if (options_.division) {
        if (parts_.stored && parts_.stored->isJoin())
            throw failure(Msg::splitJoin, {parts_.plan.output.name});
        options_.division->plan(parts_.plan);
        for (std::string& line : options_.division->notes()) parts_.plan.notes.push_back(std::move(line));
    }
    const bool joins = parts_.stored && parts_.stored->isJoin();
    lengths_ = InputLengths(parts_.sources, joins ? parts_.stored->inputs() : std::vector<std::string>());
    warnings_.add(parts_.plan.warnings);
    warnings_.addEngine([this](const std::string& text) { return parts_.outputs.withFinalNames(text); });
    if (parts_.pipe)
        fitToPlace(*parts_.pipe, parts_.plan, options_.acceptPartial);
    else
        parts_.pipe = makeOutputPipe(parts_.plan, options_.acceptPartial);
    carryChunks(parts_, warnings_);
    countClipping(parts_);
    parts_.outputs.claim(parts_.plan, filesRead(), *parts_.pipe);
}

// Next to a raw file there may be others, such as its sound.
std::unique_ptr<Source> Job::openInput(const std::string& name) {
    const bool onlyOne = options_.inputs.size() == 1 && !options_.join;
    StandardInput* const standard = name == StandardInput::kName ? options_.standardInput.get() : nullptr;
    if (standard && options_.joins()) throw failure(Msg::stdinRefuses, {options_.join ? "--join" : "--cut"});
    const bool isRaw = onlyOne || !Source::describesItself(standard ? name + "." + standard->format() : name);
    rawTaken_ |= isRaw;
    auto source = std::make_unique<Source>(name, isRaw ? options_.raw : "", standard,
                                           Source::Films{.upright = !options_.noRotate});
    source->selectAll();
    return source;
}

void Job::openInputs() {
    for (const auto& name : options_.inputs) parts_.sources.push_back(openInput(name));
    if (!options_.raw.empty() && !rawTaken_) throw failure(Msg::rawNoInput);
}

// The segments become a task, which reads them one after the other.
void Job::joinInputs() {
    JoinPlanner planner(options_, parts_.outputs.form(),
                        [this](const std::string& name) { return openInput(name); });
    planner.plan();
    if (!options_.raw.empty() && !rawTaken_) throw failure(Msg::rawNoInput);
    const auto pipe = makeOutputPipe(planner.whole(), options_.acceptPartial);
    AnyDict encoder;
    pipe->store(encoder);
    parts_.stored = std::make_unique<StoredTask>(
        joinedState(planner.join(), encoder, parts_.outputs.storedName()), planner.name());
    parts_.stored->open();
    parts_.sources = parts_.stored->sources();
    parts_.pipe = parts_.stored->takePipe();
    JobPlan plan = planTask(*parts_.stored, planner.whole().output, readInputs(), options_.acceptPartial);
    plan.warnings = planner.whole().warnings;
    level_ = planner.level();
    if (level_ && options_.dryRun && options_.saveTask.empty())
        plan.notes.push_back(lineOf(Msg::joinLevelLater));
    plan.filterFiles.read = planner.files();
    begin(std::move(plan));
}

void Job::fitToInputs() {
    options_.fit = [this](int type, int input, int stream, QvEncoder& encoder) {
        fitEncoder(encoder, type, parts_.sources[static_cast<size_t>(input)]->decoder(), stream, options_);
    };
}

std::vector<JobInput> Job::readInputs() const {
    std::vector<JobInput> inputs;
    for (const auto& source : parts_.sources) inputs.push_back(readInput(*source));
    if (joined_) inputs.back().joined = true;
    return inputs;
}

// Where --map takes channels of several sounds, they become one sound of a further input.
void Job::joinSounds() {
    if (options_.sound.map.empty()) return;
    const std::vector<int> sounds = parseChannelMap(options_.sound.map).sounds();
    std::vector<JoinedSound::Part> all, parts;
    std::vector<std::string> names;
    for (const auto& source : parts_.sources)
        for (int i = 0; i < source->decoder().nrStreams(qvAudioStream); ++i) {
            if (std::binary_search(sounds.begin(), sounds.end(), static_cast<int>(all.size()))) {
                parts.push_back({&source->decoder(), i});
                names.push_back(source->name());
            }
            all.push_back({&source->decoder(), i});
        }
    // The plan refuses what is not there.
    if (sounds.size() < 2 || parts.size() < sounds.size()) return;
    const auto rateOf = [&](size_t part) {
        return parts[part].decoder->getAudioParam(parts[part].stream, "samplerate").asInt32(0);
    };
    for (size_t i = 1; i < parts.size(); ++i)
        if (rateOf(i) != rateOf(0))
            throw failure(Msg::mapSounds, {std::to_string(sounds[i]), std::to_string(rateOf(i)),
                                           std::to_string(sounds[0]), std::to_string(rateOf(0))});
    parts_.sources.push_back(
        std::make_unique<Source>(joined(names, " + "), std::make_unique<JoinedSound>(parts)));
    joined_ = true;
}

// What filters read is an input as well.
std::vector<std::string> Job::filesRead() const {
    std::vector<std::string> files = parts_.plan.filterFiles.read;
    for (const auto& source : parts_.sources)
        files.insert(files.end(), source->files().begin(), source->files().end());
    if (!parts_.stored || options_.joins()) return files;
    files.push_back(parts_.stored->name());
    const std::vector<std::string> named = parts_.stored->allInputs();
    files.insert(files.end(), named.begin(), named.end());
    return files;
}

std::pair<std::vector<double>, double> Job::measureGains() {
    MeasuringPass pass(options_);
    Keyboard keyboard(pass.progress.onTerminal(), [&](char key) { pass.pressed(key); });
    const Signals::Watch measuring(signals_, {.first = [&](int) { pass.stop(); },
                                              .second = [this] { return parts_.outputs.leave(); },
                                              .report = [&] { pass.progress.report(pass.now()); },
                                              .suspend = [&] { pass.progress.time().stopping(); },
                                              .resume = [&] { pass.progress.time().continued(); }});
    const MemoryWatch memory;
    pass.progress.start(pass.now());
    std::optional<std::vector<double>> gains;
    try {
        gains = level_->gains(
            [&](double measured) { return pass.goOn(measured) && signals_.received() == Exit::done; });
    } catch (const std::exception&) {
        if (memory.ranOut()) throw std::bad_alloc();
        throw;
    }
    ProgressState end = pass.now();
    end.state = gains ? "running" : "stopped";
    pass.progress.finish(end);
    if (!gains) throw Failure(signals_.received(), lineOf(Msg::stoppedWithNothing));
    return {*gains, pass.progress.time().seconds()};
}

void Job::checkWarnings() const {
    if (options_.strict) warnings_.refuse(options_.quiet, parts_.plan.output.name);
}

void Job::printPlan() {
    {
        const Signals::Watch storing(signals_,
                                     {.first = {}, .second = [this] { return parts_.outputs.leave(); }});
        saveTask(parts_, options_, signals_);
        parts_.outputs.commitTask();
    }
    printText((parts_.stored ? segmentsText(*parts_.stored) : "") + planText(parts_.plan) +
              (options_.division ? options_.division->text() : ""));
    if (!options_.quiet) warnings_.show();
    if (!options_.quiet)
        for (const auto& line : parts_.plan.notes) tell(Level::note, line);
}

std::unique_ptr<Job> readyJob(JobOptions& options, const std::function<std::unique_ptr<Job>()>& make) {
    options.sound.gains.clear();
    std::unique_ptr<Job> job = make();
    job->checkWarnings();
    if (!job->needsGains() || (options.dryRun && options.saveTask.empty())) return job;
    const auto [gains, seconds] = job->measureGains();
    options.sound.gains = gains;
    options.measuredFor = seconds;
    job.reset();  // which has the names of the outputs
    job = make();
    job->checkWarnings();
    return job;
}

void runJob(JobOptions& options, const std::function<std::unique_ptr<Job>()>& make) {
    // Of an input that becomes shorter each time that it is read.
    constexpr int mostAttempts = 3;
    for (int attempt = 1;; ++attempt) {
        const std::unique_ptr<Job> job = readyJob(options, make);
        if (options.dryRun) return job->printPlan();
        try {
            return job->run();
        } catch (const InputShrank& shrank) {
            if (!options.acceptPartial || attempt == mostAttempts) throw;
            options.warnings.push_back(shrank.warning);
            if (job->taskIsStream()) options.saveTask.clear();
        }
    }
}

AnyDict Job::stored() { return storedState(parts_, options_); }

void Job::run() { JobRun(options_, parts_, lengths_, warnings_, signals_).run(); }
