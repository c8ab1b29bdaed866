#include "tarsel/host/outputs/owner.h"

#include <cerrno>
#include <charconv>
#include <climits>

#include <fcntl.h>
#include <signal.h>
#include <unistd.h>

#include "tarsel/host/outputs/foldercalls.h"

namespace {

constexpr std::string_view kHead = "tarsel-owner 1\n";

std::string systemFile(const std::string& name) {
    std::string text;
    readEntry(AT_FDCWD, name.c_str(), 4096, text);
    while (!text.empty() && text.back() == '\n') text.pop_back();
    return text;
}

bool toNumber(std::string_view text, long long& number) {
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    return error == std::errc() && end == text.data() + text.size() && !text.empty();
}

// The start of a process, as Owner::started; nothing for one that is not there or has ended and only waits
// for its parent.
std::optional<long long> startOf(long long pid) {
    const std::string stat = systemFile("/proc/" + std::to_string(pid) + "/stat");
    // The name of the program is in brackets and may hold anything. After it comes the state, field 3; the
    // start is field 22.
    size_t at = stat.rfind(") ");
    if (at == std::string::npos) return std::nullopt;
    at += 2;
    if (stat[at] == 'Z' || stat[at] == 'X') return std::nullopt;
    for (int field = 3; field < 22 && at != std::string::npos; ++field) {
        at = stat.find(' ', at);
        if (at != std::string::npos) ++at;
    }
    long long started = -1;
    if (at == std::string::npos ||
        !toNumber(std::string_view(stat).substr(at, stat.find(' ', at) - at), started))
        return std::nullopt;
    return started;
}

std::string hostName() {
    char name[HOST_NAME_MAX + 1] = "";
    gethostname(name, sizeof name - 1);
    return name;
}

std::string bootId() { return systemFile("/proc/sys/kernel/random/boot_id"); }

// Takes "KEY VALUE\n" from the front of `text`.
bool takeLine(std::string_view& text, std::string_view key, std::string_view& value) {
    const size_t end = text.find('\n');
    if (end == std::string_view::npos || text.substr(0, key.size()) != key || text.size() <= key.size() ||
        text[key.size()] != ' ')
        return false;
    value = text.substr(key.size() + 1, end - key.size() - 1);
    text.remove_prefix(end + 1);
    return true;
}

}  // namespace

Owner Owner::self() { return {hostName(), bootId(), getpid(), startOf(getpid()).value_or(-1)}; }

std::string Owner::text() const {
    return std::string(kHead) + "host " + host + "\nboot " + boot + "\npid " + std::to_string(pid) +
           "\nstarted " + std::to_string(started) + "\n";
}

std::optional<Owner> Owner::parse(std::string_view text) {
    if (text.substr(0, kHead.size()) != kHead) return std::nullopt;
    text.remove_prefix(kHead.size());
    std::string_view host, boot, pid, started;
    Owner owner;
    if (!takeLine(text, "host", host) || !takeLine(text, "boot", boot) || !takeLine(text, "pid", pid) ||
        !takeLine(text, "started", started) || !toNumber(pid, owner.pid) || !toNumber(started, owner.started))
        return std::nullopt;
    owner.host = host;
    owner.boot = boot;
    return owner;
}

Owner::State Owner::state() const {
    const bool sameHost = host == hostName(), sameStart = boot == bootId();
    // Containers of one host have names and process numbers of their own, and the start in common.
    if (!sameHost) return sameStart && !boot.empty() ? State::gone : State::elsewhere;
    if (!sameStart) return State::gone;
    if (started < 0)
        return pid > 0 && kill(static_cast<pid_t>(pid), 0) != 0 && errno == ESRCH ? State::gone
                                                                                  : State::living;
    return startOf(pid) == started ? State::living : State::gone;
}
