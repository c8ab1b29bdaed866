// tarsel: the command-line tool of the engine.
#include <algorithm>
#include <clocale>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <memory>
#include <new>
#include <sstream>

#include <fcntl.h>
#include <unistd.h>

#include <qvplugcore/qvplugcore.h>
#include <CLI/CLI.hpp>

#include "tarsel/commands/commands.h"
#include "tarsel/host/console.h"
#include "tarsel/host/outputs.h"
#include "tarsel/host/signals.h"
#include "tarsel/words/failure.h"

namespace {

// The engine traces the unloading of plug-ins on the standard error, past any log; a user would take it for
// talk.
class QuietStderr {
  public:
    explicit QuietStderr(bool on) {
        if (!on) return;
        saved_ = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 3);
        const int nowhere = open("/dev/null", O_WRONLY | O_CLOEXEC);
        if (saved_ >= 0 && nowhere >= 0) dup2(nowhere, STDERR_FILENO);
        if (nowhere >= 0) close(nowhere);
    }
    ~QuietStderr() {
        if (saved_ < 0) return;
        dup2(saved_, STDERR_FILENO);
        close(saved_);
    }
    QuietStderr(const QuietStderr&) = delete;
    QuietStderr& operator=(const QuietStderr&) = delete;

  private:
    int saved_ = -1;
};

// The engine, from the first command to the end of the program.
class Engine {
  public:
    Engine(const std::string& log, const std::string& plugins) {
        AnyDict config;
        if (!log.empty()) config.set("logfile", log.c_str());
        init_wrapper(&config);
        qv_registry()->addPlugin(qvSubtitlePlugin());
        pluginsLoaded_ = !plugins.empty();
        if (pluginsLoaded_ && qv_registry()->scanFolder(Any(plugins.c_str())) != QvStatus::ok)
            std::fprintf(stderr, "tarsel: warning: no plug-ins in %s\n", inQuotes(plugins).c_str());
        qvPresetMgr()->update();
    }
    ~Engine() {
        const QuietStderr quiet(pluginsLoaded_);
        cleanup_wrapper();
    }

  private:
    bool pluginsLoaded_ = false;
};

std::vector<std::string> subcommandNames(const CLI::App& app) {
    std::vector<std::string> names;
    for (const CLI::App* sub : app.get_subcommands({})) names.push_back(sub->get_name());
    return names;
}

int status(Exit exit) { return static_cast<int>(exit); }

int say(Exit exit, const std::string& line) {
    if (!line.empty()) std::fprintf(stderr, "tarsel: %s\n", line.c_str());
    return status(exit);
}

// The parser's words for what was given too much.
std::string unexpected(const CLI::App& used, const std::vector<std::string>& known) {
    const std::vector<std::string> words = used.remaining(true);
    if (words.empty()) return "there is a word too many";
    const std::string word = words.front().substr(0, words.front().find('='));
    const bool option = word.size() > 1 && word[0] == '-';
    return std::string("unknown ") + (option ? "option " : "argument ") + inQuotes(word) + "." +
           suggestion(word, known);
}

// Wrong use: what the parser says, with near matches for an unknown option.
int wrongUse(const CLI::App& app, const CLI::ParseError& error) {
    const CLI::App* used = &app;
    for (const CLI::App* sub : app.get_subcommands()) used = sub;
    std::vector<std::string> known = used == &app ? subcommandNames(app) : std::vector<std::string>();
    for (const CLI::Option* option : used->get_options())
        for (const auto& name : option->get_lnames()) known.push_back("--" + name);
    std::string line;
    if (dynamic_cast<const CLI::ExtrasError*>(&error))
        line = unexpected(*used, known);
    else if (used == &app)
        line = "give a command.";
    else
        line = inLine(error.what()) + ".";
    const std::string help = used == &app ? "tarsel --help" : "tarsel " + used->get_name() + " --help";
    return say(Exit::usage, line + " See '" + help + "'");
}

// The parser takes a mistyped command for a missing one.
void checkCommand(const CLI::App& app, int argc, char** argv) {
    const std::vector<std::string> known = subcommandNames(app);
    for (int i = 1; i < argc; ++i) {
        const std::string word = argv[i];
        if (word == "--log" || word == "--plugins") ++i;
        if (word.empty() || word[0] == '-') continue;
        if (std::find(known.begin(), known.end(), word) == known.end())
            throw Failure(Exit::usage, "there is no command " + inQuotes(word) + "." +
                                           suggestion(word, known) + " 'tarsel --help' lists all");
        return;
    }
}

int run(int argc, char** argv) {
    Signals signals;
    CLI::App app("Transcodes, inspects and draws media from the command line.", "tarsel");
    app.require_subcommand(1);
    app.set_version_flag("--version", std::string("tarsel ") + QvUtil::libraryVersion().asString());
    std::string log, plugins;
    app.add_option("--log", log, "Write the engine's log to FILE, or to stderr")->type_name("FILE");
    app.add_option("--plugins", plugins, "Load the plug-ins of FOLDER")
        ->type_name("FOLDER")
        ->envname("TARSEL_PLUGINS");
    Action chosen;
    addTranscode(app, chosen, signals);
    addInfo(app, chosen);
    addCaptions(app, chosen);
    addFrame(app, chosen, signals);
    addModules(app, chosen);
    addFormats(app, chosen);
    addPresets(app, chosen);
    try {
        checkCommand(app, argc, argv);
        app.parse(argc, argv);
    } catch (const CLI::Success& shown) {
        std::ostringstream text;
        app.exit(shown, text, text);
        printText(text.str());
        flushOutput();
        return status(Exit::done);
    } catch (const CLI::ParseError& error) {
        return wrongUse(app, error);
    }
    Engine engine(log, plugins);
    chosen();
    flushOutput();
    return status(Exit::done);
}

bool tell(const char* text) { return write(STDERR_FILENO, text, std::strlen(text)) >= 0; }

// Where memory is so short that not even the way out has enough, nothing half-done may stay behind.
[[noreturn]] void breakOff() {
    const bool abandoned = Outputs::abandonAll();
    const char* reason = "tarsel: an internal error";
    try {
        if (std::current_exception()) throw;
    } catch (const std::bad_alloc&) {
        reason = "tarsel: out of memory";
    } catch (...) {
    }
    const bool told = tell(reason) && tell(abandoned ? "; nothing was left behind\n" : "\n");
    _exit(status(told ? Exit::failed : Exit::output));
}

}  // namespace

int main(int argc, char** argv) {
    std::setlocale(LC_ALL, "C");
    claimStreams();
    std::set_terminate(breakOff);
    try {
        return run(argc, argv);
    } catch (const Failure& failure) {
        return say(failure.exit(), failure.what());
    } catch (const QvException& failure) {
        return say(Exit::failed, inLine(failure.what()));
    } catch (const std::bad_alloc&) {
        return say(Exit::failed, "out of memory");
    } catch (const std::exception& failure) {
        return say(Exit::failed, inLine(failure.what()));
    }
}
