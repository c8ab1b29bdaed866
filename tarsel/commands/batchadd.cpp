// tarsel batch LIST add: plans jobs and puts them into the list.
#include <algorithm>
#include <filesystem>
#include <unordered_map>

#include "tarsel/batch/batchfile.h"
#include "tarsel/batch/order.h"
#include "tarsel/commands/batchcommands.h"
#include "tarsel/commands/transcode.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/host/signals.h"
#include "tarsel/host/standardinput.h"
#include "tarsel/job/job.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

using Words = std::vector<std::string>;

struct Given : GivenJob {
    Words files, tasks;
};

// What one of the jobs becomes in the list.
struct NewTask {
    AnyDict state;
    std::string output;
    Words places;
};

class Adding {
  public:
    Adding(Given& given, const BatchFile& file, Words words, Signals& signals)
        : given_(given), file_(file), words_(std::move(words)), signals_(signals) {}

    void run() {
        checkWords();
        requireFile(file_.name());
        for (const std::string& name : given_.tasks) addStored(name);
        if (!given_.files.empty()) addFiles();
        if (!given_.job.inputs.empty()) addJob();
        store();
    }

  private:
    void checkWords() const {
        const JobOptions& job = given_.job;
        if (!given_.files.empty() && !job.inputs.empty()) throw failure(Msg::batchFilesAndInputs);
        if (given_.files.empty() && given_.tasks.empty() && job.inputs.empty())
            throw failure(Msg::argumentMissing, {"INPUT", "tarsel batch LIST add --help"});
        if (StreamOutput::namesDescriptor(job.output)) throw failure(Msg::batchOutputStream, {job.output});
        if (job.output == "-") throw failure(Msg::batchOutputStream, {job.output});
    }

    void addStored(const std::string& name) {
        const StoredTask stored(name);
        for (const std::string& log : stored.qualityLogs())
            tell(Level::warning, lineOf(Msg::taskLogLeft, {name, log}));
        take(stored.state(), stored.output(), {places_.of(stored.output())});
    }

    // Whether an outputs exists is a question of the run.
    JobOptions planned(JobOptions job) const {
        job.policy.overwrite = true;
        job.policy.recover = false;
        return job;
    }

    void addPlanned(const GivenJob& one) {
        GivenJob given = one;
        if (std::count(given.job.inputs.begin(), given.job.inputs.end(), StandardInput::kName) > 0)
            throw failure(Msg::stdinRefuses, {"batch"});
        given.job = planned(given.job);
        resolveJob(given);
        const auto job = readyJob(given.job, [&] { return std::make_unique<Job>(given.job, signals_); });
        take(job->stored(), absoluteName(given.job.output), job->places());
    }

    void take(const AnyDict& state, const std::string& output, Words places) {
        // As it will be read, so that its name stays the same.
        new_.push_back({StoredTask(state, output).raw(), output, std::move(places)});
    }

    // --- Files by a pattern.

    static std::string filled(const std::string& pattern, const std::string& input, size_t number) {
        const fs::path path(input);
        std::string name;
        for (size_t at = 0; at < pattern.size();) {
            const size_t open = std::min(pattern.find('{', at), pattern.size());
            name += pattern.substr(at, open - at);
            if (open == pattern.size()) break;
            const size_t close = std::min(pattern.find('}', open), pattern.size());
            const std::string key = pattern.substr(open, close - open + 1);
            if (key == "{name}")
                name += path.stem().string();
            else if (key == "{ext}")
                name += path.has_extension() ? path.extension().string().substr(1) : "";
            else if (key == "{n}")
                name += std::to_string(number);
            else
                throw failure(Msg::batchPatternKey, {pattern, key, "{name}, {ext} and {n}"});
            at = close + 1;
        }
        return name;
    }

    void addFiles() {
        Words inputs;
        for (const std::string& pattern : given_.files) {
            const Words found = filesMatching(pattern);
            if (found.empty()) throw failure(Msg::batchNoFiles, {pattern});
            for (const std::string& name : found)
                if (std::find(inputs.begin(), inputs.end(), name) == inputs.end()) inputs.push_back(name);
        }
        const std::string pattern = given_.job.output;
        if (inputs.size() > 1 && pattern.find('{') == std::string::npos)
            throw failure(Msg::batchPatternNeeded, {pattern, "{name}"});
        for (size_t i = 0; i < inputs.size(); ++i) {
            GivenJob one = given_;
            one.job.inputs = {inputs[i]};
            one.job.output = filled(pattern, inputs[i], i + 1);
            addPlanned(one);
        }
    }

    // --- One job.

    void addJob() {
        std::string waits;
        for (const std::string& input : given_.job.inputs)
            if (waits.empty() && !exists(input)) waits = writerOf(input);
        if (waits.empty()) return addPlanned(given_);
        if (given_.job.output.empty()) throw failure(Msg::outputMissing);
        requireFolder(fs::path(absoluteName(given_.job.output)).parent_path().string(), given_.job.output);
        Words inputs;
        for (const std::string& input : given_.job.inputs)
            if (exists(input) || !writerOf(input).empty()) inputs.push_back(absoluteName(input));
        const std::string output = absoluteName(given_.job.output);
        tell(Level::note, lineOf(Msg::batchWaits, {given_.job.inputs.front(), waits}));
        new_.push_back({plannedLater(words_, workingFolder(), inputs, output), output, {places_.of(output)}});
    }

    // The number of the task that makes a file; "" if none does.
    std::string writerOf(const std::string& input) {
        if (!read_) {
            QvBatchList list = file_.load();
            int number = 0;
            for (const Any& stored : list) {
                ++number;
                for (const std::string& place :
                     places_.writtenBy(outputOf(stored.asDict(), number, file_.folder())))
                    outputs_.add(static_cast<size_t>(number), place);
            }
            read_ = true;
        }
        const auto writers = outputs_.writersOf(places_.of(absoluteName(input)));
        return writers.empty() ? "" : std::to_string(writers.back());
    }

    // --- The list.

    // All or none.
    void store() {
        int first = 0;
        file_.change([&](QvBatchList& list) {
            std::unordered_map<std::string, int> owners;
            int number = 0;
            for (const Any& stored : list)
                for (const std::string& place :
                     places_.writtenBy(outputOf(stored.asDict(), ++number, file_.folder())))
                    owners.emplace(place, number);
            first = number + 1;
            for (NewTask& task : new_) {
                ++number;
                for (const std::string& place : task.places)
                    if (const auto [other, fresh] = owners.emplace(place, number); !fresh)
                        throw failure(Msg::batchOutputTwice, {task.output, std::to_string(other->second)});
                list.append(QvTaskState(task.state));
            }
        });
        if (given_.job.quiet) return;
        const std::string count = std::to_string(new_.size());
        if (new_.size() == 1)
            tell(Level::note, "added task " + std::to_string(first) + ": " + inQuotes(new_[0].output));
        else
            tell(Level::note, "added " + count + " tasks, from number " + std::to_string(first) + " on");
    }

    Given& given_;
    const BatchFile& file_;
    Words words_;
    Signals& signals_;
    Places places_;
    OutputIndex outputs_;
    bool read_ = false;
    std::vector<NewTask> new_;
};

// Those after "batch LIST add".
Words wordsOfJob(const Words& words, const std::string& list) {
    for (size_t i = 1; i + 2 < words.size(); ++i)
        if (words[i] == "batch" && words[i + 1] == list && words[i + 2] == "add")
            return {words.begin() + static_cast<std::ptrdiff_t>(i) + 3, words.end()};
    return {};
}

void addOptions(Command& command, Given& given) {
    addJobOptions(command, given, Need::optional);
    command.group("");
    command.list("--files", given.files, "In the place of INPUTs: a task for each file; -o has {name} in it",
                 "PATTERN");
    command.list("--task", given.tasks, "A job that transcode --save-task has written", "FILE");
    command.flag("-q,--quiet", given.job.quiet, "Print nothing but errors");
}

}  // namespace

void addBatchAdd(Command& batch, Signals& signals, const ListName& list,
                 const std::vector<std::string>& words) {
    Command command = batch.command("add", "Plan a job, with the options of transcode, and add it as a task");
    const auto given = std::make_shared<Given>();
    addOptions(command, *given);
    command.action([&signals, list, given, words] {
        const BatchFile file(*list);
        Adding(*given, file, wordsOfJob(words, *list), signals).run();
    });
}

void planWords(const std::vector<std::string>& words, JobOptions& job) {
    CommandLine line("", "");
    Command command = line.command("add", "");
    Given given;
    addOptions(command, given);
    command.action([] {});
    std::vector<std::string> all = {"tarsel", "add"};
    all.insert(all.end(), words.begin(), words.end());
    std::vector<char*> pointers;
    for (std::string& word : all) pointers.push_back(word.data());
    line.parse(static_cast<int>(pointers.size()), pointers.data());
    const JobOptions how = job;
    resolveJob(given);
    job = given.job;
    job.policy = how.policy;
    job.progress = how.progress;
    job.quiet = how.quiet;
    job.strict = how.strict;
    job.acceptPartial = job.acceptPartial || how.acceptPartial;
    job.effects.acceptPartial = job.acceptPartial;
}
