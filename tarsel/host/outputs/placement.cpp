#include "tarsel/host/outputs/placement.h"

#include <cerrno>

#include "tarsel/host/outputs/foldercalls.h"

PlaceResult placeOne(int work, int place, const Manifest::Row& row, bool overwrite, bool sync) {
    const char *hidden = row.hidden.c_str(), *name = row.name.c_str();
    int error = overwrite ? exchangeEntries(work, hidden, place, name) : ENOENT;
    const bool exchanged = error == 0;
    if (error == ENOENT) error = moveEntry(work, hidden, place, name);
    // Some file systems can't exchange. A plain rename is one step as well, but there is no way back.
    if (error == EINVAL && overwrite) {
        error = renameOver(work, hidden, place, name);
        if (error == 0 && sync) syncFolder(place);
        return {error, row.name};
    }
    if (error == 0 && sync) {
        error = syncFolder(place);
        if (error != 0) {
            const int back =
                exchanged ? exchangeEntries(place, name, work, hidden) : moveEntry(place, name, work, hidden);
            return {error, row.name, back != 0};
        }
    }
    return {error, row.name};
}

SetPlacement::SetPlacement(int work, int place, const Manifest& set, bool sync)
    : work_(work), place_(place), set_(set), sync_(sync) {}

PlaceResult SetPlacement::prepare() {
    int error = writeEntry(work_, Manifest::kDraft, set_.text());
    if (error == 0 && sync_) error = syncFileSystem(work_);
    return {error, {}};
}

// The next state; a draft becomes the first one.
int SetPlacement::enter(const char* from, const char* to) {
    const int error = moveEntry(work_, from, work_, to);
    return error == 0 && sync_ ? syncFolder(work_) : error;
}

PlaceResult SetPlacement::moveOldIn() {
    if (const int error = enter(Manifest::kDraft, Manifest::kMovingOldIn)) return {error, {}};
    for (; in_ < set_.old.size(); ++in_) {
        const auto& row = set_.old[in_];
        const int error = moveEntry(place_, row.name.c_str(), work_, row.hidden.c_str());
        // One that somebody has removed meanwhile need not be moved.
        if (error != 0 && error != ENOENT) return {error, row.name};
    }
    if (const int error = sync_ ? syncFolder(place_) : 0) return {error, {}};
    return {};
}

PlaceResult SetPlacement::moveNewOut() {
    const char* before = set_.old.empty() ? Manifest::kDraft : Manifest::kMovingOldIn;
    if (const int error = enter(before, Manifest::kMovingNewOut)) return {error, {}};
    for (; out_ < set_.fresh.size(); ++out_) {
        const auto& row = set_.fresh[out_];
        if (const int error = moveEntry(work_, row.hidden.c_str(), place_, row.name.c_str()))
            return {error, row.name};
    }
    return {sync_ ? syncFolder(place_) : 0, {}};
}

// Whether the old files stand again. It goes back through the same states, so that an end in between is
// finished like any other.
bool SetPlacement::takeBack() {
    while (out_ > 0) {
        const auto& row = set_.fresh[out_ - 1];
        if (moveEntry(place_, row.name.c_str(), work_, row.hidden.c_str()) != 0) return false;
        --out_;
    }
    if (entryExists(work_, Manifest::kMovingNewOut) &&
        enter(Manifest::kMovingNewOut, Manifest::kMovingOldIn) != 0 &&
        !entryExists(work_, Manifest::kMovingOldIn))
        return in_ == 0;
    bool all = true;
    for (; in_ > 0; --in_) {
        const auto& row = set_.old[in_ - 1];
        const int error = moveEntry(work_, row.hidden.c_str(), place_, row.name.c_str());
        all = all && (error == 0 || error == ENOENT);
    }
    return all;
}

PlaceResult SetPlacement::run() {
    PlaceResult result = set_.old.empty() ? PlaceResult() : moveOldIn();
    if (result.error == 0) result = moveNewOut();
    if (result.error != 0) result.torn = !takeBack();
    return result;
}

PlaceResult finishSet(int work, int place, const Manifest& set, bool complete, bool sync) {
    PlaceResult result;
    for (const auto& row : complete ? set.fresh : set.old) {
        // One that is not in the work folder has been moved before.
        const int error = moveEntry(work, row.hidden.c_str(), place, row.name.c_str());
        if (error != 0 && error != ENOENT && !result.torn) result = {error, row.name, true};
    }
    if (!result.torn && sync) {
        if (const int error = syncFolder(place)) result = {error, {}, true};
    }
    return result;
}
