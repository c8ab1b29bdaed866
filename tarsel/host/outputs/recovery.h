// Work folders that runs have left because they were ended in the middle: what they had begun is finished,
// the rest is removed.
#pragma once

#include <optional>
#include <string>
#include <vector>

struct RecoveryRules {
    bool all = false;      // also those whose owner can't be known here
    long long stale = -1;  // seconds after which such a folder counts as left; negative: never
    bool sync = true;
};

struct Leftover {
    enum class Outcome : unsigned char {
        removed,
        completed,   // its set had been put in place halfway, and now is
        restored,    // the files it was about to replace have their names again
        inUse,       // its owner is at work
        elsewhere,   // of the host `detail`
        ownerless,   // it does not say whose it is
        notOurs,     // of another user, or others may write into it
        unreadable,  // its manifest can't be read
        inTheWay,    // a file `detail` of the set exists that the run has not made
        failed,      // `detail` says why
    };
    Outcome outcome;
    std::string folder;  // name in the place
    std::string detail;
    size_t files = 0;     // of a set, or removed
    long long bytes = 0;  // removed

    // Whether it is still there.
    bool remains() const { return outcome > Outcome::restored; }
};

// Looks at all work folders in `place` and does what can be done. Safe while other runs and calls are active,
// and may itself be ended at any point. Nothing for a place that can't be listed.
std::vector<Leftover> recoverPlace(const std::string& place, const RecoveryRules& rules);

// One line for each thing that a user should know, without "tarsel: ". `brief`: what a job says, for which
// folders of running jobs and of other users are no matter.
std::vector<std::string> recoveryLines(const std::string& place, const std::vector<Leftover>& found,
                                       bool brief);
