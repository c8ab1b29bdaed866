// tarsel batch LIST run: all tasks that are left, or some of them in this process; submit and cancel: the
// same by a scheduler.
#include <algorithm>
#include <climits>
#include <optional>
#include <thread>

#include "tarsel/batch/journal.h"
#include "tarsel/batch/report.h"
#include "tarsel/batch/runner.h"
#include "tarsel/batch/snapshot.h"
#include "tarsel/batch/submitter.h"
#include "tarsel/batch/taskrun.h"
#include "tarsel/cluster/slurm.h"
#include "tarsel/commands/batchcommands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/commands/progressoption.h"
#include "tarsel/host/childprocess.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/signals.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

using Words = std::vector<std::string>;

constexpr int kMostJobs = 64;
constexpr int kMostRetries = 100;

struct Given {
    OutputOptions outputs;
    ProgressOption progress;
    std::string jobs, retries, timeout, threads, handed, report, arraySize, snapshot;
    Words tasks, schedulerOptions;
    bool stopOnError = false, verify = false, quiet = false, slurm = false;
    bool allowPost = false, acceptPartial = false, strict = false;
};

// --- Some tasks in this process.

// One that waited for others fails if one of them has not made its input.
void runElement(const Given& given, TaskRun& how, const BatchFile& file, Signals& signals) {
    const size_t mark = given.snapshot.rfind('@');
    if (mark == std::string::npos || given.tasks.size() != 1)
        throw failure(Msg::valueMissing, {"--snapshot", "one --task and FILE@PLACE"});
    const SnapshotTasks found =
        readSnapshot(file, given.snapshot.substr(0, mark), given.snapshot.substr(mark + 1));
    if (found.task.id != given.tasks[0])
        throw failure(Msg::batchUnreadable, {given.snapshot, "it holds another task"});
    how.ready = [&] {
        requireFonts(found.task.state, shownTask(file, found.task));
        for (const BatchTask& maker : found.makers)
            if (!TaskRecord::read(file.journal(maker.id)).isDone(keyOf(maker), given.verify))
                throw failure(Msg::batchInputFailed, {found.task.output, std::to_string(maker.number)});
    };
    how.run(file, found.task, signals);
}

void runTasks(const Given& given, const BatchFile& file, Signals& signals) {
    TaskRun how;
    how.job.threads = how.job.processors = limitThreads(given.threads);
    how.job.policy = given.outputs.policy();
    how.job.policy.quiet = how.job.quiet = given.quiet;
    how.job.progress = given.progress.mode;
    how.job.acceptPartial = given.acceptPartial;
    how.job.strict = given.strict;
    how.allowPost = given.allowPost;
    how.verify = given.verify;
    how.plan = planWords;
    if (!given.handed.empty()) {
        const auto number = static_cast<int>(parseNumber(given.handed, 1, INT_MAX, "--handed"));
        return how.run(file, file.handedTasks(ChildProcess::kHanded, {number}).front(), signals);
    }
    if (!given.snapshot.empty()) return runElement(given, how, file, signals);
    QvBatchList list = file.load();
    const std::vector<BatchTask> tasks = file.tasksOf(list);
    std::vector<size_t> wanted;
    for (const std::string& word : given.tasks) wanted.push_back(findTask(tasks, word, file));
    for (const size_t i : wanted) {
        const int index = static_cast<int>(i);
        how.run(file, batchTask(list.at(index), index + 1, file.folder()), signals);
    }
}

// --- All that is left.

double timeLimit(const std::string& text) {
    if (text.empty()) return -1;
    const double seconds = parseTime(text, std::nullopt, "--timeout").seconds();
    if (seconds <= 0) throw failure(Msg::timeWrong, {"--timeout", text});
    return seconds;
}

int numberOf(const std::string& text, int otherwise, int low, int high, const char* option) {
    return text.empty() ? otherwise : static_cast<int>(parseNumber(text, low, high, option));
}

// What is passed on to the processes of tasks.
void addFlags(Words& words, const Given& given) {
    const struct {
        bool on;
        const char* option;
    } flags[] = {{given.outputs.overwrite, "-y"},          {given.outputs.keep, "-n"},
                 {given.outputs.noSync, "--no-sync"},      {given.verify, "--verify"},
                 {given.allowPost, "--allow-post"},        {given.strict, "--strict"},
                 {given.acceptPartial, "--accept-partial"}};
    for (const auto& flag : flags)
        if (flag.on) words.emplace_back(flag.option);
    if (!given.outputs.stale.empty()) words.insert(words.end(), {"--stale", given.outputs.stale});
}

Words commandOf(const Given& given, const BatchFile& file, int jobs) {
    Words words = {"batch", file.name(), "run", "--progress", "json"};
    addFlags(words, given);
    const int cores = static_cast<int>(std::thread::hardware_concurrency());
    const int threads = std::max(cores / jobs, 1);
    if (!given.threads.empty())
        words.insert(words.end(), {"--threads", given.threads});
    else if (jobs > 1)
        words.insert(words.end(), {"--threads", std::to_string(threads)});
    words.emplace_back("--handed");
    return words;
}

void runAll(const Given& given, const BatchFile& file, const std::string& log, Signals& signals) {
    BatchOptions options;
    options.jobs = numberOf(given.jobs, 1, 1, kMostJobs, "--jobs");
    options.retries = numberOf(given.retries, 0, 0, kMostRetries, "--retry");
    options.timeout = timeLimit(given.timeout);
    options.timeoutText = given.timeout;
    options.stopOnError = given.stopOnError;
    options.verify = given.verify;
    options.quiet = given.quiet;
    options.progress = given.progress.mode;
    options.policy = given.outputs.policy();
    options.command = commandOf(given, file, options.jobs);
    if (!log.empty() && log != "stderr") options.log = absoluteName(log);
    std::optional<ReportFile> report;
    if (!given.report.empty()) report.emplace(given.report, Words{file.name()}, options.policy);
    const BatchResult result = BatchRunner(file, options, signals).run();
    if (report) report->write(result);
    const auto count = [&](auto... ends) {
        return std::count_if(result.tasks.begin(), result.tasks.end(),
                             [&](const BatchTaskResult& task) { return ((task.end == ends) || ...); });
    };
    const auto done = count(TaskEnd::done, TaskEnd::already), failed = count(TaskEnd::failed);
    const std::string all = std::to_string(static_cast<long>(result.tasks.size()) - count(TaskEnd::disabled));
    Words outputs;
    for (const BatchTaskResult& task : result.tasks)
        if (task.end == TaskEnd::done)
            outputs.insert(outputs.end(), task.written.begin(), task.written.end());
    Events::get().wrote(outputs);
    if (const auto status = static_cast<Exit>(result.status); status != Exit::done && status != Exit::failed)
        throw Failure(status, lineOf(Msg::batchStopped, {std::to_string(done), all, file.shown()}));
    if (failed > 0) throw failure(Msg::batchTasksFailed, {file.shown(), std::to_string(failed), all});
    if (!given.quiet)
        tell(Level::note, (all == "1" ? "1 task is" : "all " + all + " tasks are") + " done, in " +
                              formatTime(result.seconds).substr(0, 7));
}

// --- What a scheduler runs.

void submit(const Given& given, const BatchFile& file, const Scheduler& scheduler, const std::string& log) {
    SubmitOptions options;
    options.arraySize = static_cast<size_t>(numberOf(given.arraySize, SlurmScheduler::kMostElements, 1,
                                                     SlurmScheduler::kMostElements, "--array-size"));
    options.atOnce = numberOf(given.jobs, 0, 1, INT_MAX, "--jobs");
    options.verify = given.verify;
    given.outputs.policy();  // refuses what contradicts itself
    if (!log.empty() && log != "stderr") options.log = absoluteName(log);
    options.command = ChildProcess::passed();
    for (const std::string& word : Words{"batch", file.name(), "run", "--quiet"})
        options.command.push_back(word);
    addFlags(options.command, given);
    options.options = given.schedulerOptions;
    Submitter submitter(file, scheduler, options);
    submitter.submit();
    const size_t count = submitter.submitted();
    const Words& jobs = submitter.jobs();
    std::string line = std::to_string(count) + (count == 1 ? " task" : " tasks") + " submitted";
    if (!jobs.empty()) line += (jobs.size() == 1 ? " as job " : " as jobs ") + joined(jobs);
    tell(Level::note, line + "; " + std::to_string(submitter.doneBefore()) + " done before, " +
                          std::to_string(submitter.living()) + " queued or running");
}

void cancel(const BatchFile& file) {
    const auto [jobs, left] = cancelSubmitted(file, SlurmScheduler());
    if (jobs.empty()) return tell(Level::note, lineOf(Msg::schedulerNothing, {file.shown()}));
    tell(Level::note, (jobs.size() == 1 ? "job " : "jobs ") + joined(jobs) + " cancelled");
    if (left > 0) tell(Level::warning, lineOf(Msg::schedulerEnds, {file.shown(), std::to_string(left)}));
}

// Options that mean the same in run and in submit.
void addShared(Command& command, Given& given) {
    command.flag("--verify", given.verify, "Know what was done by the bytes of the outputs as well");
    command.flag("--allow-post", given.allowPost, "Run the commands that tasks have for afterwards");
    command.flag("--accept-partial", given.acceptPartial, "Accept damaged inputs and take what can be read");
    command.flag("--strict", given.strict, "Let a task fail if there is a warning");
    given.outputs.add(command);
}

}  // namespace

void addBatchRun(Command& batch, Signals& signals, const ListName& list, const std::string& version,
                 const std::string& log) {
    Command command = batch.command("run", "Run the tasks that are not done");
    const auto given = std::make_shared<Given>();
    command.option("--jobs", given->jobs, "So many tasks at a time (1)", "N");
    command.option("--retry", given->retries, "Try a task that failed so often again (0)", "N");
    command.option("--timeout", given->timeout, "Stop a task that takes longer: SS, MM:SS, HH:MM:SS", "TIME");
    command.flag("--stop-on-error", given->stopOnError, "Begin no task after one has failed");
    command.list("--task", given->tasks, "Run only this task, in this process", "TASK");
    command.option("--snapshot", given->snapshot,
                   "Of the elements of submit: where the task is, and those that make its inputs",
                   "FILE@PLACE");
    command.option("--handed", given->handed, "Of the processes of a run: the task is in descriptor 3", "N");
    command.option("--report", given->report, "Write what became of each task as a page or as JSON",
                   "FILE.html|.json");
    given->progress.add(command);
    addThreads(command, given->threads);
    addShared(command, *given);
    command.flag("-q,--quiet", given->quiet, "Print nothing but errors");
    command.action(
        [&signals, &log, list, given] {
            const BatchFile file(*list);
            if (given->tasks.empty() && given->handed.empty()) return runAll(*given, file, log, signals);
            for (const auto& [value, name] : {std::pair{&given->jobs, "--jobs"},
                                              {&given->retries, "--retry"},
                                              {&given->timeout, "--timeout"},
                                              {&given->report, "--report"}})
                if (!value->empty()) throw failure(Msg::optionsExclude, {"--task", name});
            runTasks(*given, file, signals);
        },
        [list, given, version] { given->progress.open("", {*list}, given->outputs.overwrite, version); });
}

void addBatchCluster(Command& batch, const ListName& list, const std::string& log) {
    Command command = batch.command("submit", "Let a scheduler run the tasks that are not done");
    const auto given = std::make_shared<Given>();
    command.flag("--slurm", given->slurm, "By Slurm, as arrays of jobs");
    command.option("--jobs", given->jobs, "So many tasks of an array at a time (all)", "N");
    command.option("--array-size", given->arraySize, "The most tasks of an array (1000)", "N");
    addShared(command, *given);
    command.arguments("OPTION", given->schedulerOptions,
                      "After --: options for the scheduler, as --partition=NAME", 0, Need::optional);
    command.action([&log, list, given] {
        const BatchFile file(*list);
        if (!given->slurm) throw failure(Msg::schedulerUnknown, {file.shown()});
        submit(*given, file, SlurmScheduler(), log);
    });
    batch.command("cancel", "Take back what a scheduler has of the list").action([list] {
        cancel(BatchFile(*list));
    });
}
