#include "tarsel/host/plugins.h"

#include <algorithm>
#include <array>
#include <cstdio>
#include <cstdlib>
#include <string_view>

#include <signal.h>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/host/terminal.h"
#include "tarsel/words/messages.h"

namespace {

int g_warnings = 0;

void warn(const std::string& line) {
    ++g_warnings;
    std::fprintf(stderr, "tarsel: warning: %s\n", line.c_str());
}

// A line in memory that is there already: a crashed program has no other to offer.
class FixedLine {
  public:
    void add(std::string_view text) {
        const std::size_t count = std::min(text.size(), text_.size() - 1 - length_);
        length_ += text.copy(&text_[length_], count);
    }
    void addName(std::string_view name) {
        add("'");
        for (const char c : name)
            add(static_cast<unsigned char>(c) < 0x20 || c == 0x7F ? "?" : std::string_view(&c, 1));
        add("'");
    }
    std::string_view end() {
        text_[length_++] = '\n';
        return {text_.data(), length_};
    }

  private:
    std::array<char, 6000> text_;
    std::size_t length_ = 0;
};

constexpr std::array kCrashes = {
    std::pair{SIGSEGV, "it crashed"}, std::pair{SIGBUS, "it crashed"},  std::pair{SIGFPE, "it crashed"},
    std::pair{SIGILL, "it crashed"},  std::pair{SIGABRT, "it aborted"},
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
        case QvPluginFault::unsafe: return Msg::pluginUnsafe;
        case QvPluginFault::invalid: return Msg::pluginInvalid;
        case QvPluginFault::unresolved: return Msg::pluginUnresolved;
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

}  // namespace

void loadPlugins(const std::string& folder) {
    std::atexit([] { blameLoadingPlugin("it called exit()"); });
    const CrashWatch watch;
    if (qv_registry()->scanFolder(Any(folder.c_str())) != QvStatus::ok)
        warn(lineOf(Msg::pluginsAbsent, {folder}));
    for (const QvPluginFailure& failure : qv_registry()->pluginFailures()) {
        const Any name = failure.file.toString();
        warn(lineOf(messageOf(failure.fault), {name.asString(""), harmless(failure.reason)}));
    }
}

int pluginWarnings() { return g_warnings; }

void blameLoadingPlugin(const char* why) {
    const char* const file = QvRegistry::loadingPlugin();
    if (!file) return;
    const Message& row = messages()[static_cast<std::size_t>(Msg::pluginEndedAll)];
    const std::string_view what = row.what, placeholder = "{file}";
    const std::size_t at = what.find(placeholder);
    FixedLine line;
    line.add("tarsel: ");
    line.add(what.substr(0, at));
    line.addName(file);
    line.add(what.substr(at + placeholder.size()));
    line.add(": ");
    line.add(why);
    line.add("; ");
    line.add(row.remedy);
    writeToStderr(line.end());
    leave(static_cast<int>(row.exit));
}
