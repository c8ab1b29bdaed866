#include "tarsel/host/outputs/recovery.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <ctime>
#include <filesystem>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tarsel/host/outputs/foldercalls.h"
#include "tarsel/host/outputs/manifest.h"
#include "tarsel/host/outputs/owner.h"
#include "tarsel/host/outputs/placement.h"
#include "tarsel/host/outputs/workfolder.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

using Outcome = Leftover::Outcome;

constexpr size_t kMostManifest = size_t{1} << 28;
constexpr size_t kMostOwner = 4096;

// Seconds since anything in the folder has changed.
long long age(int folder) {
    time_t newest = 0;
    struct stat status;
    if (fstat(folder, &status) == 0) newest = status.st_mtime;
    std::vector<std::string> names;
    listFolder(folder, names);
    for (const auto& name : names)
        if (fstatat(folder, name.c_str(), &status, AT_SYMLINK_NOFOLLOW) == 0)
            newest = std::max(newest, status.st_mtime);
    return static_cast<long long>(std::time(nullptr)) - static_cast<long long>(newest);
}

class Visit {
  public:
    Visit(int place, std::string name, const RecoveryRules& rules)
        : place_(place), rules_(rules), found_{Outcome::failed, std::move(name), "", 0, 0} {}

    // Nothing when the folder is gone, or was when it was looked at.
    std::optional<Leftover> run() {
        folder_.reset(openat(place_, found_.folder.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
        struct stat status;
        if (!folder_ || fstat(folder_.get(), &status) != 0) {
            // What has only the name of a work folder is none.
            if (errno == ENOENT || errno == ENOTDIR || errno == ELOOP) return std::nullopt;
            return errno == EACCES ? as(Outcome::notOurs) : as(Outcome::failed, std::strerror(errno));
        }
        if (status.st_uid != geteuid() || (status.st_mode & (S_IWGRP | S_IWOTH)) != 0)
            return as(Outcome::notOurs);
        if (!lock()) return found_;
        if (gone_) return std::nullopt;
        return finish();
    }

  private:
    Leftover as(Outcome outcome, std::string detail = "") {
        found_.outcome = outcome;
        found_.detail = std::move(detail);
        return found_;
    }

    // Opens the owner. Where there is none yet or any more the folder is empty, and is removed: a run that is
    // about to put its owner there makes another one.
    bool openOwner() {
        const auto open = [&] {
            owner_.reset(
                openat(folder_.get(), WorkFolder::kOwner, O_RDWR | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
            return static_cast<bool>(owner_);
        };
        if (open()) return true;
        gone_ = unlinkat(place_, found_.folder.c_str(), AT_REMOVEDIR) == 0 || errno == ENOENT;
        return !gone_ && open();
    }

    // True if the folder may be taken, or is gone; otherwise `found_` says why not.
    bool lock() {
        if (!openOwner()) return gone_ || maySeize(Outcome::ownerless, "");
        if (flock(owner_.get(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK) {
            as(Outcome::inUse);
            return false;
        }
        // Another one has removed it since it was opened.
        struct stat status;
        if (fstat(owner_.get(), &status) == 0 && status.st_nlink == 0) return gone_ = true;
        std::string text;
        readEntry(folder_.get(), WorkFolder::kOwner, kMostOwner, text);
        // An end right after the lock; a living one would have it.
        if (text.empty()) return true;
        const std::optional<Owner> owner = Owner::parse(text);
        if (!owner) return maySeize(Outcome::ownerless, "");
        switch (owner->state()) {
            case Owner::State::living: as(Outcome::inUse); return false;
            case Owner::State::elsewhere: return maySeize(Outcome::elsewhere, owner->host);
            case Owner::State::gone: break;
        }
        return true;
    }

    bool maySeize(Outcome otherwise, const std::string& detail) {
        if (rules_.all || (rules_.stale >= 0 && age(folder_.get()) > rules_.stale)) return true;
        as(otherwise, detail);
        return false;
    }

    Leftover finish() {
        const bool restore = entryExists(folder_.get(), Manifest::kMovingOldIn);
        const bool complete = !restore && entryExists(folder_.get(), Manifest::kMovingNewOut);
        size_t moved = 0;
        if (restore || complete) {
            std::string text;
            const char* name = restore ? Manifest::kMovingOldIn : Manifest::kMovingNewOut;
            if (const int error = readEntry(folder_.get(), name, kMostManifest, text);
                error != 0 && error != EFBIG)
                return as(Outcome::unreadable);
            const std::optional<Manifest> set = Manifest::parse(text);
            if (!set) return as(Outcome::unreadable);
            const PlaceResult result = finishSet(folder_.get(), place_, *set, complete, rules_.sync);
            if (result.error == EEXIST) return as(Outcome::inTheWay, std::string(result.name));
            if (result.error != 0) return as(Outcome::failed, std::strerror(result.error));
            moved = complete ? set->fresh.size() : set->old.size();
        }
        WorkFolder work(Descriptor(dup(place_)), found_.folder, std::move(folder_), std::move(owner_));
        const WorkFolder::Removed removed = work.remove();
        if (entryExists(place_, found_.folder.c_str())) return as(Outcome::failed, whatStays());
        found_.files = restore || complete ? moved : removed.files;
        found_.bytes = removed.bytes;
        return as(restore ? Outcome::restored : complete ? Outcome::completed : Outcome::removed);
    }

    // What a work folder still has that no run puts there.
    std::string whatStays() const {
        const Descriptor folder(
            openat(place_, found_.folder.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
        std::vector<std::string> names;
        if (!folder || listFolder(folder.get(), names) != 0) return "it can't be removed";
        for (const auto& name : names) {
            struct stat status;
            if (name == WorkFolder::kOwner ||
                fstatat(folder.get(), name.c_str(), &status, AT_SYMLINK_NOFOLLOW))
                continue;
            return (S_ISDIR(status.st_mode) ? "the folder " : "the file ") + inQuotes(name) + " is in it";
        }
        return "it can't be removed";
    }

    int place_;
    const RecoveryRules& rules_;
    Leftover found_;
    Descriptor folder_, owner_;
    bool gone_ = false;
};

std::string counted(size_t files) { return std::to_string(files) + (files == 1 ? " file" : " files"); }

}  // namespace

std::vector<Leftover> recoverPlace(const std::string& place, const RecoveryRules& rules) {
    std::vector<Leftover> all;
    const Descriptor folder(openFolder(place.c_str()));
    std::vector<std::string> names;
    if (!folder || listFolder(folder.get(), names) != 0) return all;
    for (auto& name : names)
        if (name.rfind(WorkFolder::kPrefix, 0) == 0)
            if (auto found = Visit(folder.get(), std::move(name), rules).run())
                all.push_back(std::move(*found));
    return all;
}

std::vector<std::string> recoveryLines(const std::string& place, const std::vector<Leftover>& found,
                                       bool brief) {
    std::vector<std::string> lines;
    size_t files = 0, folders = 0;
    long long bytes = 0;
    for (const auto& one : found) {
        const std::string path = (std::filesystem::path(place) / one.folder).string();
        switch (one.outcome) {
            case Outcome::removed:
                files += one.files;
                bytes += one.bytes;
                ++folders;
                break;
            case Outcome::completed:
                lines.push_back(lineOf(Msg::setCompleted, {counted(one.files), place}));
                break;
            case Outcome::restored:
                lines.push_back(lineOf(Msg::setRestored, {counted(one.files), place}));
                break;
            case Outcome::inUse:
                if (!brief) lines.push_back(lineOf(Msg::workInUse, {path}));
                break;
            case Outcome::notOurs:
                if (!brief) lines.push_back(lineOf(Msg::workNotOurs, {path}));
                break;
            case Outcome::elsewhere:
                lines.push_back(lineOf(Msg::workElsewhere, {path, one.detail, place}));
                break;
            case Outcome::ownerless: lines.push_back(lineOf(Msg::workOwnerless, {path, place})); break;
            case Outcome::unreadable: lines.push_back(lineOf(Msg::manifestUnreadable, {path})); break;
            case Outcome::inTheWay:
                lines.push_back(lineOf(Msg::setInTheWay,
                                       {path, (std::filesystem::path(place) / one.detail).string(), place}));
                break;
            case Outcome::failed: lines.push_back(lineOf(Msg::workStays, {path, one.detail})); break;
        }
    }
    if (files > 0 || (folders > 0 && !brief))
        lines.push_back(lineOf(Msg::leftRemoved, {counted(files), formatBytes(bytes)}));
    return lines;
}
