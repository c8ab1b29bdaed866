// tarsel run: carries out a task file.
#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/commands/progressoption.h"
#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/host/outputs/streamoutput.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/job.h"
#include "tarsel/job/task/taskfilters.h"
#include "tarsel/job/task/taskplan.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"

namespace {

// Options as they were given; they are parsed once the command runs.
struct Given {
    JobOptions job;
    OutputOptions outputs;
    ProgressOption progress;
    std::string task, output, threads;
    bool allowPost = false;
};

bool isNullDevice(const std::string& output) {
    const auto stream = output.empty() ? nullptr : StreamOutput::find(output, {});
    return stream && stream->discards();
}

// What the command line says for a job, the task says here.
std::unique_ptr<StoredTask> openTask(const Given& given, JobOptions& job) {
    auto task = std::make_unique<StoredTask>(given.task);
    job.output = given.output.empty() ? task->output() : given.output;
    checkTaskFilters(*task, job.acceptPartial);
    // A multiplexer that goes back to its header can't write there.
    if (isNullDevice(job.output)) task->discardOutput();
    task->open();
    const QvMuxer* const muxer = task->task().encoder()->getMuxer();
    job.kind = taskOutputKind(*task);
    job.muxer = muxer ? muxer->name() : "nullmux";
    job.inputs = task->inputs();
    job.splitChannels = job.muxer == "rawmux" && muxer->QvCodec::getParam("splitAudio").isTrue();
    return task;
}

std::string commandOf(const Given& given, const StoredTask& task) {
    const std::string command = task.postProcess();
    if (command.empty() || given.allowPost) return command;
    tell(Level::warning, lineOf(Msg::taskPostLeft, {given.task, command}));
    return "";
}

void run(Given& given, Signals& signals) {
    limitThreads(given.threads);
    given.job.policy = given.outputs.policy();
    given.job.policy.recover = !given.job.dryRun;
    given.job.policy.quiet = given.job.quiet;
    runJob(given.job, [&] {
        JobOptions job = given.job;
        auto task = openTask(given, job);
        job.post = commandOf(given, *task);
        for (const std::string& log : task->qualityLogs())
            job.warnings.push_back(lineOf(Msg::taskLogLeft, {given.task, log}));
        return std::make_unique<Job>(job, std::move(task), signals);
    });
}

}  // namespace

void addRun(CommandLine& line, Signals& signals, const std::string& version) {
    Command command = line.command("run", "Carry out a task file, as transcode --save-task writes it");
    auto given = std::make_shared<Given>();
    JobOptions& job = given->job;
    command.argument("TASK", given->task, "A task file (XML)");
    command.option("-o,--output", given->output, "Where the output goes, in the place of what the task says",
                   "FILE");
    command.flag("--allow-post", given->allowPost, "Run the command that the task has for afterwards");
    given->progress.add(command);
    command.flag("--accept-partial", job.acceptPartial, "Take what is there of a damaged input");
    command.flag("--strict", job.strict, "Let the job fail if there is a warning");
    addThreads(command, given->threads);
    command.flag("--dry-run", job.dryRun, "Print the plan and do nothing");
    given->outputs.add(command);
    command.flag("-q,--quiet", job.quiet, "Say nothing but errors");
    command.action([&signals, given] { run(*given, signals); },
                   [given, version] {
                       given->progress.open(given->output, {given->task}, given->outputs.overwrite, version);
                       given->job.progress = given->progress.mode;
                   });
}
