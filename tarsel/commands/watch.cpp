// tarsel watch: transcodes the files that arrive in a folder.
#include <memory>

#include "tarsel/commands/commands.h"
#include "tarsel/commands/outputoptions.h"
#include "tarsel/commands/progressoption.h"
#include "tarsel/host/follow/filefacts.h"
#include "tarsel/host/terminal.h"
#include "tarsel/watch/watcher.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

// Options as they were given; they are parsed once the command runs.
struct Given {
    std::string folder, base, moveTo, failedTo, state, settle, scan, raw, threads;
    std::vector<std::string> presets;
    bool keep = false, remove = false, once = false, overwrite = false, retryFailed = false, quiet = false;
    bool acceptPartial = false, strict = false, noRotate = false;
    ProgressOption progress;
};

// Among the inputs, and hidden so that it is none of them.
constexpr const char* kMemory = ".watch.tarsel";

void exclude(bool first, const char* firstName, bool second, const char* secondName) {
    if (first && second) throw failure(Msg::optionsExclude, {firstName, secondName});
}

// A folder that inputs are moved to.
std::string putAwayFolder(const std::string& name, const char* option, const std::string& watched,
                          const WatchTargets& targets) {
    if (name.empty()) return "";
    const std::string folder = realName(name);
    bool wrong = folder == watched;
    for (int i = 0; i < targets.count(); ++i) wrong |= folder == realName(targets.folder(i));
    if (wrong) throw failure(Msg::watchFolderIsOther, {option, name});
    return folder;
}

WatchOptions optionsOf(const Given& given, const std::string& folder, const WatchTargets& targets) {
    using After = WatchOptions::After;
    WatchOptions options;
    options.folder = folder;
    options.memory = given.state.empty() ? folder + "/" + kMemory : realName(given.state);
    options.after = given.remove ? After::remove : given.moveTo.empty() ? After::keep : After::move;
    options.moveTo = putAwayFolder(given.moveTo, "--move", folder, targets);
    options.failedTo = putAwayFolder(given.failedTo, "--failed", folder, targets);
    if (!given.settle.empty()) options.settleSeconds = parseDecimal(given.settle, 0.1, 3600, "--settle");
    if (!given.scan.empty()) options.scanSeconds = parseDecimal(given.scan, 0.1, 86400, "--scan");
    options.once = given.once;
    options.overwrite = given.overwrite;
    options.quiet = given.quiet;
    options.retryFailed = given.retryFailed;
    options.progress = given.progress.mode;
    // A log of a service has a line for each file already.
    if (options.progress.how == ProgressMode::How::automatic && !stderrIsTerminal())
        options.progress.how = ProgressMode::How::off;
    options.raw = given.raw;
    if (!given.threads.empty()) options.jobOptions.push_back("--threads=" + given.threads);
    if (given.acceptPartial) options.jobOptions.push_back("--accept-partial");
    if (given.noRotate) options.jobOptions.push_back("--no-rotate");
    if (given.strict) options.jobOptions.push_back("--strict");
    return options;
}

void watch(const Given& given, Signals& signals) {
    exclude(given.keep, "--keep", given.remove, "--delete");
    exclude(given.keep, "--keep", !given.moveTo.empty(), "--move");
    exclude(given.remove, "--delete", !given.moveTo.empty(), "--move");
    limitThreads(given.threads);
    if (given.presets.empty()) throw failure(Msg::argumentMissing, {"--preset", "tarsel watch --help"});
    namesIn(given.folder);  // or it can't be read
    const std::string folder = realName(given.folder);
    const WatchTargets targets(given.presets, given.base.empty() ? folder + "-out" : given.base, folder);
    const WatchOptions options = optionsOf(given, folder, targets);
    targets.makeFolders();
    Watcher(options, targets, signals).run();
}

}  // namespace

void addWatch(CommandLine& line, Signals& signals, const std::string& version) {
    Command command = line.command("watch", "Transcode each file that arrives in a folder, once");
    auto given = std::make_shared<Given>();
    command.argument("FOLDER", given->folder, "The folder; those in it are not followed");
    command.list("--preset", given->presets,
                 "What is made of each file, and where it goes; may be given several times",
                 "NAME[:OUTFOLDER]");
    command.option("-o,--output", given->base,
                   "Where presets without an OUTFOLDER get folders of their names (FOLDER-out)", "FOLDER");
    command.flag("--keep", given->keep, "Leave inputs where they are (the default)");
    command.option("--move", given->moveTo, "Move inputs there once all outputs are made and checked",
                   "FOLDER");
    command.flag("--delete", given->remove, "Delete inputs once all outputs are made and checked");
    command.option("--failed", given->failedTo,
                   "Move inputs that can't be transcoded there, each with a text that says why", "FOLDER");
    command.flag("--retry-failed", given->retryFailed, "Take files again that failed in an earlier run");
    command.flag("--once", given->once, "Transcode the files that are there, and end");
    command.option("--settle", given->settle, "How long a file has to stay unchanged before it is taken (2)",
                   "SECONDS");
    command.option("--scan", given->scan,
                   "How often the whole folder is looked through (60; 5 on a network file system)",
                   "SECONDS");
    command.option("--state", given->state, "The record of what was done (FOLDER/.watch.tarsel)", "FILE");
    command.option("--raw", given->raw, "Format of raw inputs: size=WxH,pixel=FORMAT,rate=R", "K=V,...");
    command.flag("--no-rotate", given->noRotate, "Keep films as they are coded, not turned upright");
    command.flag("--accept-partial", given->acceptPartial,
                 "Accept a damaged input and take what can be read");
    command.flag("--strict", given->strict, "Let a file fail if there is a warning");
    command.flag("-y,--overwrite", given->overwrite, "Overwrite existing outputs");
    addThreads(command, given->threads);
    given->progress.add(command);
    command.flag("-q,--quiet", given->quiet, "Print nothing but failures");
    command.action([&signals, given] { watch(*given, signals); },
                   [given, version] { given->progress.open("", {given->state}, given->overwrite, version); });
}
