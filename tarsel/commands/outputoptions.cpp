#include "tarsel/commands/outputoptions.h"

#include <charconv>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/words/commandline.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

// "90s", "90m", "12h", "30d" in seconds; -1 for "never".
long long parseAge(const std::string& text) {
    constexpr struct {
        char unit;
        long long seconds;
    } units[] = {{'s', 1}, {'m', 60}, {'h', 3600}, {'d', 24 * 3600}};
    if (text == "never") return -1;
    long long count = 0;
    const char* last = text.data() + text.size();
    const auto [end, error] = std::from_chars(text.data(), last, count);
    for (const auto& row : units)
        if (error == std::errc() && end + 1 == last && *end == row.unit && count >= 0 && count <= 1000000)
            return count * row.seconds;
    throw failure(Msg::staleNoAge, {text});
}

}  // namespace

void OutputOptions::add(Command& command) {
    command.flag("-y,--overwrite", overwrite, "Overwrite existing outputs");
    command.flag("-n,--keep", keep, "Keep existing outputs: the run then does nothing, with status 0");
    command.flag("--no-sync", noSync, "Don't wait until the disk has the outputs");
    command.option("--stale", stale,
                   "Age at which another host's work folder is removed: 90m, 12h, 30d, never (7d)", "AGE");
}

OutputPolicy OutputOptions::policy() const {
    if (overwrite && keep) throw failure(Msg::optionsExclude, {"-y", "-n"});
    OutputPolicy policy(overwrite);
    policy.keep = keep;
    policy.sync = !noSync;
    if (!stale.empty()) policy.stale = parseAge(stale);
    return policy;
}

void addThreads(Command& command, std::string& threads) {
    command.option("--threads", threads, "Threads that share the work on pictures (one for each processor)",
                   "N");
}

int limitThreads(const std::string& threads) {
    if (threads.empty()) return 0;
    const int most = static_cast<int>(parseNumber(threads, 1, kQvMostThreads, "--threads"));
    qvSetThreads(most);
    return most;
}
