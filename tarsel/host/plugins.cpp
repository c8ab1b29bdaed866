#include "tarsel/host/plugins.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <vector>

#include <signal.h>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/events.h"
#include "tarsel/host/files.h"
#include "tarsel/host/terminal.h"
#include "tarsel/words/fixedline.h"
#include "tarsel/words/messages.h"

namespace {

int g_warnings = 0;

void warn(const std::string& line) {
    ++g_warnings;
    tell(Level::warning, line);
}

constexpr std::array kCrashes = {
    std::pair{SIGSEGV, "it crashed"},
    std::pair{SIGBUS, "it crashed"},
    std::pair{SIGFPE, "it crashed"},
    std::pair{SIGILL, "it crashed"},
    std::pair{SIGABRT, "it aborted"},
    std::pair{SIGTRAP, "it crashed"},
    std::pair{SIGSYS, "it made a system call that is forbidden here"},
};
std::array<struct sigaction, kCrashes.size()> g_former;

void onCrash(int number) {
    for (std::size_t i = 0; i < kCrashes.size(); ++i) {
        if (kCrashes[i].first != number) continue;
        blameLoadingPlugin(kCrashes[i].second);
        // Not while a plug-in starts: what was in force before deals with it when this returns.
        sigaction(number, &g_former[i], nullptr);
        raise(number);
    }
}

// While it lives, a crash names the plug-in. The handler has a stack of its own: a crash may have used up the
// other.
class CrashWatch {
  public:
    CrashWatch() {
        alternative_.ss_sp = stack_.data();
        alternative_.ss_size = stack_.size();
        sigaltstack(&alternative_, &formerStack_);
        struct sigaction action {};
        action.sa_handler = onCrash;
        action.sa_flags = SA_ONSTACK;
        for (std::size_t i = 0; i < kCrashes.size(); ++i) sigaction(kCrashes[i].first, &action, &g_former[i]);
    }
    ~CrashWatch() {
        for (std::size_t i = 0; i < kCrashes.size(); ++i) sigaction(kCrashes[i].first, &g_former[i], nullptr);
        sigaltstack(&formerStack_, nullptr);
    }
    CrashWatch(const CrashWatch&) = delete;
    CrashWatch& operator=(const CrashWatch&) = delete;

  private:
    std::array<char, 64 * 1024> stack_;
    stack_t alternative_{}, formerStack_{};
};

Msg messageOf(QvPluginFault fault) {
    switch (fault) {
        case QvPluginFault::unreadable: return Msg::pluginUnreadable;
        case QvPluginFault::unsafe:
        case QvPluginFault::unsafeFolder: return Msg::pluginUnsafe;
        case QvPluginFault::invalid: return Msg::pluginInvalid;
        case QvPluginFault::unresolved: return Msg::pluginUnresolved;
        case QvPluginFault::foreign: return Msg::pluginForeign;
        case QvPluginFault::noEntry:
        case QvPluginFault::otherAbi: return Msg::pluginUnfit;
        case QvPluginFault::failed:
        case QvPluginFault::declined: break;
    }
    return Msg::pluginFailed;
}

// Names in a plug-in file are its maker's, and a reason holds some: no byte of them may act on a terminal.
std::string harmless(const std::string& text) {
    const std::string quoted = inQuotes(text);
    return quoted.substr(1, quoted.size() - 2);
}

// A warning for each file; one for all that are in the same unsafe folder.
void tell(const std::string& folder, const std::vector<QvPluginFailure>& failures) {
    for (auto failure = failures.begin(); failure != failures.end(); ++failure) {
        const auto sharesFolder = [&](const QvPluginFailure& other) {
            return other.fault == QvPluginFault::unsafeFolder && failure->fault == other.fault &&
                   failure->reason == other.reason;
        };
        if (std::any_of(failures.begin(), failure, sharesFolder)) continue;
        const auto count = std::count_if(failure, failures.end(), sharesFolder);
        const std::string reason = harmless(failure->reason);
        const Any name = failure->file.toString();
        if (count > 1)
            warn(lineOf(Msg::pluginsUnsafe, {std::to_string(count), folder, reason}));
        else
            warn(lineOf(messageOf(failure->fault), {name.asString(""), reason}));
    }
}

// Once for the whole program.
void watchEnds() {
    static const bool watched = [] {
        std::atexit([] { blameLoadingPlugin("it called exit()"); });
        std::at_quick_exit([] { blameLoadingPlugin("it called quick_exit()"); });
        return true;
    }();
    static_cast<void>(watched);
}

}  // namespace

bool loadOwnPlugins() {
    const Any library = QvUtil::libraryPath().toString();
    std::string folder = library.asString("");
    folder = folder.substr(0, folder.rfind('/') + 1) + "qvplugcore/plugins";
    if (!whyNoFolder(folder).empty()) return false;
    watchEnds();
    const CrashWatch watch;
    const bool any = qv_registry()->scanFolder(Any(folder.c_str())) == QvStatus::ok;
    tell(folder, qv_registry()->pluginFailures());
    return any;
}

void loadPlugins(const std::string& folder) {
    watchEnds();
    const CrashWatch watch;
    const auto known = static_cast<std::ptrdiff_t>(qv_registry()->pluginFailures().size());
    if (const std::string why = whyNoFolder(folder); !why.empty())
        warn(lineOf(Msg::pluginsNoFolder, {folder, why}));
    else if (qv_registry()->scanFolder(Any(folder.c_str())) != QvStatus::ok)
        warn(lineOf(Msg::pluginsAbsent, {folder}));
    const std::vector<QvPluginFailure>& all = qv_registry()->pluginFailures();
    tell(folder, {all.begin() + std::min(known, std::ssize(all)), all.end()});
}

int pluginWarnings() { return g_warnings; }

void blameLoadingPlugin(const char* why) {
    const char* const file = QvRegistry::loadingPlugin();
    if (!file) return;
    writeToStderr(FixedLine(Msg::pluginEndedAll, {file, why}).text());
    leave(static_cast<int>(messages()[static_cast<std::size_t>(Msg::pluginEndedAll)].exit));
}
