#include "tarsel/job/job.h"

#include <algorithm>

#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/job/jobrun.h"
#include "tarsel/job/keptchunks.h"
#include "tarsel/job/outputpipe.h"
#include "tarsel/job/savedtask.h"
#include "tarsel/job/task/taskplan.h"
#include "tarsel/words/messages.h"

Job::Job(const JobOptions& options, Signals& signals)
    : options_(options),
      signals_(signals),
      parts_{{}, {}, JobOutputs(options_), nullptr, nullptr},
      warnings_(options.warnings) {
    openInputs();
    begin(planJob(options_, parts_.outputs.form(), readInputs()));
}

Job::Job(const JobOptions& options, std::unique_ptr<StoredTask> task, Signals& signals)
    : options_(options),
      signals_(signals),
      parts_{{}, task->sources(), JobOutputs(options_), task->takePipe(), nullptr},
      warnings_(options.warnings) {
    parts_.stored = std::move(task);
    begin(planTask(*parts_.stored, parts_.outputs.form(), readInputs(), options_.acceptPartial));
}

void Job::begin(JobPlan plan) {
    parts_.plan = std::move(plan);
    lengths_ = InputLengths(parts_.sources);
    warnings_.add(parts_.plan.warnings);
    warnings_.addEngine([this](const std::string& text) { return parts_.outputs.withFinalNames(text); });
    if (parts_.pipe)
        fitToPlace(*parts_.pipe, parts_.plan, options_.acceptPartial);
    else
        parts_.pipe = makeOutputPipe(parts_.plan, options_.acceptPartial);
    carryChunks(parts_, warnings_);
    parts_.outputs.claim(parts_.plan, filesRead(), *parts_.pipe);
}

void Job::openInputs() {
    if (options_.inputs.empty()) throw failure(Msg::inputMissing);
    // Next to a raw file there may be others, such as its sound.
    const bool onlyOne = options_.inputs.size() == 1;
    const auto isRaw = [&](const auto& name) { return onlyOne || !Source::describesItself(name); };
    if (!options_.raw.empty() && std::none_of(options_.inputs.begin(), options_.inputs.end(), isRaw))
        throw failure(Msg::rawNoInput);
    for (const auto& name : options_.inputs) {
        parts_.sources.push_back(std::make_unique<Source>(name, isRaw(name) ? options_.raw : ""));
        parts_.sources.back()->selectAll();
    }
}

std::vector<JobInput> Job::readInputs() const {
    std::vector<JobInput> inputs;
    for (const auto& source : parts_.sources) inputs.push_back(readInput(*source));
    return inputs;
}

// What filters read is an input as well.
std::vector<std::string> Job::filesRead() const {
    std::vector<std::string> files = parts_.plan.filterFiles.read;
    for (const auto& source : parts_.sources)
        files.insert(files.end(), source->files().begin(), source->files().end());
    if (parts_.stored) files.push_back(parts_.stored->file());
    return files;
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
    printText(planText(parts_.plan));
    if (!options_.quiet) warnings_.show();
    if (!options_.quiet)
        for (const auto& line : parts_.plan.notes) tell(Level::note, line);
}

void runJob(JobOptions& options, const std::function<std::unique_ptr<Job>()>& make) {
    // Of an input that becomes shorter each time that it is read.
    constexpr int mostAttempts = 3;
    for (int attempt = 1;; ++attempt) {
        const std::unique_ptr<Job> job = make();
        job->checkWarnings();
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

void Job::run() { JobRun(options_, parts_, lengths_, warnings_, signals_).run(); }
