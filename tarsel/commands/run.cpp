// tarsel run: carries out a task file.
#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/commands/progressoption.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/job.h"
#include "tarsel/job/storedjob.h"
#include "tarsel/split/split.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"

namespace {

// Options as they were given; they are parsed once the command runs.
struct Given {
    JobOptions job;
    OutputOptions outputs;
    ProgressOption progress;
    std::string task, output, threads, split;
    SplitPlace place;
    bool allowPost = false;
};

void run(Given& given, Signals& signals) {
    given.job.threads = limitThreads(given.threads);
    given.job.policy = given.outputs.policy();
    given.job.policy.recover = !given.job.dryRun;
    given.job.policy.quiet = given.job.quiet;
    if (!given.place.slurm && !given.place.options.empty())
        throw failure(Msg::wordTooMany, {given.place.options.front(), "tarsel run --help"});
    const auto division = makeSplit(given.split, given.place);
    runJob(given.job, [&] {
        JobOptions job = given.job;
        job.output = given.output;
        auto task = std::make_unique<StoredTask>(given.task);
        openStoredJob(*task, job, given.allowPost);
        job.division = division ? division : storedSplit(*task);
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
    command.flag("--accept-partial", job.acceptPartial, "Accept a damaged input and take what can be read");
    command.flag("--strict", job.strict, "Let the job fail if there is a warning");
    command.option("--split", given->split, "Make the picture in N parts, side by side", "N");
    command.flag("--slurm", given->place.slurm, "Make the parts on a cluster, by Slurm");
    addThreads(command, given->threads);
    command.flag("--dry-run", job.dryRun, "Print the plan and do nothing");
    given->outputs.add(command);
    command.flag("-q,--quiet", job.quiet, "Print nothing but errors");
    command.arguments("OPTION", given->place.options, "After --: options for sbatch, as --partition=NAME", 0,
                      Need::optional);
    command.action([&signals, given] { run(*given, signals); },
                   [given, version] {
                       given->progress.open(given->output, {given->task}, given->outputs.overwrite, version);
                       given->job.progress = given->progress.mode;
                   });
}
