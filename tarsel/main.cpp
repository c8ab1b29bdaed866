// tarsel: the command-line tool of the engine.
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <new>
#include <system_error>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/commands/commands.h"
#include "tarsel/commands/progressoption.h"
#include "tarsel/host/childprocess.h"
#include "tarsel/host/console.h"
#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/memory.h"
#include "tarsel/host/outputs/transaction.h"
#include "tarsel/host/plugins.h"
#include "tarsel/host/signals.h"
#include "tarsel/host/terminal.h"
#include "tarsel/words/commandline.h"
#include "tarsel/words/fixedline.h"
#include "tarsel/words/messages.h"

namespace {

// The engine, from the first command to the end of the program.
class Engine {
  public:
    // `plugins`: a folder of the user's, "" for none, after the one that belongs to the library.
    Engine(const std::string& log, const std::string& plugins, bool ownPlugins, bool allowUnsafe)
        : log_(log) {
        AnyDict config;
        if (!log.empty() && log != "stderr") requireLog(log);
        if (!log.empty()) config.set("logfile", log.c_str());
        if (allowUnsafe) config.set("allow_unsafe_plugins", 1);
        init_wrapper(&config);
        qv_registry()->addPlugin(qvSubtitlePlugin());
        if (ownPlugins) pluginsLoaded_ = loadOwnPlugins();
        if (!plugins.empty()) loadPlugins(plugins);
        pluginsLoaded_ = pluginsLoaded_ || !plugins.empty();
        qvPresetMgr()->update();
    }
    ~Engine() {
        tellOfLog();
        // The engine traces the unloading of plug-ins on the standard error, past any log; a user would take
        // it for talk.
        const QuietStderr quiet(pluginsLoaded_);
        // The result is there; a trace for which there is no memory changes nothing.
        try {
            cleanup_wrapper();
        } catch (const std::bad_alloc&) {
        }
    }

  private:
    // The job has its result whether or not the log has it all.
    void tellOfLog() const {
        const int error = qv_dbg()->writeError();
        if (error == 0 || log_.empty() || log_ == "stderr") return;
        try {
            const Failure why = systemFailure(Msg::logNotWritten, log_, error);
            std::fprintf(stderr, "tarsel: warning: %s\n", why.what());
        } catch (const std::bad_alloc&) {
        }
    }

    std::string log_;
    bool pluginsLoaded_ = false;
};

int status(Exit exit) { return static_cast<int>(exit); }

int say(Exit exit, const std::string& line) {
    if (!line.empty()) tell(exit == Exit::done ? Level::note : Level::error, line);
    if (exit == Exit::done) Events::get().kept();
    return status(exit);
}

CommandLine::Parsed parse(CommandLine& line, int argc, char** argv, const std::string& version) {
    try {
        return line.parse(argc, argv);
    } catch (const Failure&) {
        openEventsFor({argv, argv + argc}, version);
        throw;
    }
}

int run(int argc, char** argv) {
    Signals signals;
    const std::string version = std::string("tarsel ") + QvUtil::libraryVersion().asString();
    CommandLine line("Transcodes, inspects and draws media from the command line.", version);
    std::string log, plugins;
    bool noPlugins = false, allowUnsafePlugins = false;
    line.option("--log", log, "Write the engine's log to FILE, or to stderr", "FILE", nullptr);
    line.option("--plugins", plugins, "Load the plug-ins of FOLDER", "FOLDER", "TARSEL_PLUGINS");
    line.flag("--no-plugins", noPlugins, "Leave out the plug-ins that came with the library");
    line.flag("--allow-unsafe-plugins", allowUnsafePlugins, "Load plug-ins that other users may change, too");
    addTranscode(line, signals, version);
    addRun(line, signals, version);
    addWatch(line, signals, version);
    addTask(line, signals);
    addBatch(line, signals, version, {argv, argv + argc}, log);
    addInfo(line);
    addLoudness(line);
    addMix(line, signals);
    addViews(line, signals);
    addCaptions(line, signals);
    addFrame(line, signals, version);
    addCompare(line, signals);
    addScope(line, signals);
    addModules(line);
    addFormats(line);
    addPresets(line, signals);
    addRecover(line);
    const CommandLine::Parsed parsed = parse(line, argc, argv, version);
    if (!parsed.action) {
        printText(parsed.text);
        flushOutput();
        return status(Exit::done);
    }
    if (!log.empty() && log != "stderr") requireOwnLog(log, {argv + 1, argv + argc});
    if (parsed.prepare) parsed.prepare();
    if (log == "stderr" && Events::get().descriptor() == 2)
        throw failure(Msg::optionsExclude, {"--log stderr", "--progress json"});
    std::vector<std::string> common;
    if (!plugins.empty()) common.insert(common.end(), {"--plugins", absoluteName(plugins)});
    if (noPlugins) common.emplace_back("--no-plugins");
    if (allowUnsafePlugins) common.emplace_back("--allow-unsafe-plugins");
    ChildProcess::passOn(common);
    Engine engine(log, plugins, !noPlugins, allowUnsafePlugins);
    parsed.action();
    flushOutput();
    return status(Exit::done);
}

// Where memory is so short that not even the way out has enough, nothing half-done may stay.
[[noreturn]] void breakOff() {
    blameLoadingPlugin("an exception left its start");
    // The result has its name; what could not be put away changes nothing.
    if (Signals::isComplete()) leave(status(Exit::done));
    Transaction::abandonAll();
    Msg reason = MemoryWatch(0).ranOut() ? Msg::outOfMemory : Msg::engineFailed;
    try {
        if (std::current_exception()) throw;
    } catch (const std::bad_alloc&) {
        reason = Msg::outOfMemory;
    } catch (...) {
    }
    const int ended = status(writeToStderr(FixedLine(reason).text()) ? Exit::failed : Exit::output);
    Events::get().endNow(ended);
    leave(ended);
}

// Every way that a command ends, as a status.
int guarded(int argc, char** argv) {
    const MemoryWatch memory;
    try {
        return run(argc, argv);
    } catch (const Failure& failure) {
        return say(failure.exit(), failure.what());
    } catch (const QvMemoryFailure&) {
        return say(Exit::failed, lineOf(Msg::outOfMemory));
    } catch (const QvException&) {
        return say(Exit::failed, lineOf(memory.ranOut() ? Msg::outOfMemory : Msg::engineFailed));
    } catch (const std::bad_alloc&) {
        return say(Exit::failed, lineOf(Msg::outOfMemory));
    } catch (const std::system_error& failed) {
        const Failure failure = failureOf(failed);
        return say(failure.exit(), failure.what());
    } catch (const std::exception&) {
        return say(Exit::failed, lineOf(Msg::engineFailed));
    }
}

}  // namespace

int main(int argc, char** argv) {
    std::setlocale(LC_ALL, "C");
    claimStreams();
    std::set_terminate(breakOff);
    countMemoryRefusals();
    const int status = guarded(argc, argv);
    Events::get().end(status);
    return status;
}
