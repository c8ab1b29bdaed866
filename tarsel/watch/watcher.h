// Follows a folder and makes of each file that arrives what the presets say, each file once.
#pragma once

#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "tarsel/host/follow/filefacts.h"
#include "tarsel/host/follow/foldernotices.h"
#include "tarsel/host/follow/wake.h"
#include "tarsel/host/signals.h"
#include "tarsel/job/progress.h"
#include "tarsel/watch/arrivals.h"
#include "tarsel/watch/memory.h"
#include "tarsel/watch/targets.h"
#include "tarsel/watch/toolrun.h"

// Names of folders are as realName gives them; "" for none.
struct WatchOptions {
    enum class After { keep, move, remove };  // of an input of which all targets were made

    std::string folder, memory;
    After after = After::keep;
    std::string moveTo, failedTo;
    std::string raw;                         // format of inputs that do not describe themselves
    std::vector<std::string> jobOptions;     // of each transcode
    double settleSeconds = 2;                // for so long a file must not change before it is taken
    std::optional<double> scanSeconds = {};  // between two looks at the whole folder
    bool once = false;                       // what is there, and no more
    bool overwrite = false, quiet = false;
    bool retryFailed = false;  // what failed in earlier runs as well
    ProgressMode progress;
};

class Watcher {
  public:
    // Throws Failure.
    Watcher(const WatchOptions& options, const WatchTargets& targets, Signals& signals);
    // Until a signal stops it, or with `once` until all is done. Throws Failure when a signal stopped it, and
    // when `once` could not make all.
    void run();

  private:
    enum class Ended {
        settled,  // made or failed, for good
        waits,    // for what has nothing to do with the input
        changed,  // while it was read
        stopped,
    };

    void follow();
    void takeNotices();
    void scan();
    void lookAt(const std::string& name);
    bool isNothingToDo(const std::string& name, const FileFacts& facts);
    void mention(const std::string& name, const char* why);
    void handle(const std::string& name);
    Ended make(const std::string& name, const FileFacts& facts);
    Ended begin(WatchedFile& file);
    std::string whyTaken(const std::string& output, const std::string& name,
                         const std::set<std::string>& torn) const;
    Ended makeTarget(WatchedFile& file, int target, const std::string& output, bool torn,
                     std::vector<std::string>& failures);
    void sayMade(const std::string& name, const std::string& output, const ToolResult& result) const;
    Ended afterwards(WatchedFile& file);
    Ended putAside(WatchedFile& file, const std::vector<std::string>& failures);
    Ended waitFor(const std::string& name, const std::string& why);
    std::vector<int> missing(const WatchedFile& file) const;
    bool hasSoundOnly(const std::string& path);
    long long untilNext(long long now) const;
    void end() const;

    std::string pathOf(const std::string& name) const;
    bool stopped() const { return wake_.stopped(); }

    const WatchOptions& options_;
    const WatchTargets& targets_;
    Signals& signals_;
    Wake wake_;
    WatchMemory memory_;
    FolderNotices notices_;
    Arrivals arrivals_;
    ToolRun tool_;
    long long scanEvery_, nextScan_ = 0;       // milliseconds
    std::map<std::string, std::string> told_;  // by name, the last reason that was said
    std::map<std::string, int> delays_;        // how often a file has waited in a row
    std::set<std::string> failedBefore_;       // in this run
    int done_ = 0, failed_ = 0, waiting_ = 0;
};
