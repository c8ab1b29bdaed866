#include "tarsel/host/outputs/workfolder.h"

#include <cerrno>
#include <cstring>
#include <filesystem>
#include <utility>

#include <dirent.h>
#include <fcntl.h>
#include <stdlib.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tarsel/host/outputs/foldercalls.h"
#include "tarsel/host/outputs/manifest.h"
#include "tarsel/host/outputs/owner.h"

namespace {

constexpr int kMostDepth = 4;  // of folders below that of the parts

int removeOnce(int folder, WorkFolder::Removed& removed, int depth = 0);

// A folder of parts, with what is in it; whether anything went.
bool removeParts(int place, const char* name, WorkFolder::Removed& removed, int depth) {
    if (depth > kMostDepth) return false;
    const Descriptor folder(openat(place, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
    if (!folder) return false;
    bool some = false;
    while (removeOnce(folder.get(), removed, depth) > 0) some = true;
    return unlinkat(place, name, AT_REMOVEDIR) == 0 || some;
}

// Removes the plain files and links of a folder, and the folder of parts; how many entries went. Those that a
// manifest or the owner stands in are not counted as files. `depth`: 0 for the work folder itself.
int removeOnce(int folder, WorkFolder::Removed& removed, int depth) {
    int count = 0;
    alignas(dirent64) char entries[4096];
    lseek(folder, 0, SEEK_SET);
    for (ssize_t size; (size = getdents64(folder, entries, sizeof entries)) > 0;)
        for (ssize_t at = 0; at < size;) {
            const auto* entry = reinterpret_cast<const dirent64*>(entries + at);
            at += entry->d_reclen;
            const std::string_view name = entry->d_name;
            if (name == "." || name == ".." || (depth == 0 && name == WorkFolder::kOwner)) continue;
            struct stat status;
            const bool known = fstatat(folder, entry->d_name, &status, AT_SYMLINK_NOFOLLOW) == 0;
            if (unlinkat(folder, entry->d_name, 0) != 0) {
                const bool parts = depth > 0 || name == WorkFolder::kParts;
                if (parts && removeParts(folder, entry->d_name, removed, depth + 1)) ++count;
                continue;
            }
            ++count;
            if (!known || name == Manifest::kDraft) continue;
            ++removed.files;
            removed.bytes += status.st_size;
        }
    return count;
}

// Whether anything but the owner is in a folder.
bool holdsMore(int folder) {
    alignas(dirent64) char entries[4096];
    lseek(folder, 0, SEEK_SET);
    for (ssize_t size; (size = getdents64(folder, entries, sizeof entries)) > 0;)
        for (ssize_t at = 0; at < size;) {
            const auto* entry = reinterpret_cast<const dirent64*>(entries + at);
            at += entry->d_reclen;
            const std::string_view name = entry->d_name;
            if (name != "." && name != ".." && name != WorkFolder::kOwner) return true;
        }
    return false;
}

}  // namespace

// False if a run that cleans the place has taken the folder for one that was left: it is empty until its
// owner is named.
bool WorkFolder::lockNew() {
    struct stat status;
    if (flock(owner_.get(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK) return false;
    return fstat(owner_.get(), &status) != 0 || status.st_nlink > 0;
}

int WorkFolder::make(const std::string& place) {
    constexpr int kAttempts = 100;
    place_.reset(openFolder(place.c_str()));
    if (!place_) return errno;
    const std::string record = Owner::self().text();
    for (int attempt = 0; attempt < kAttempts; ++attempt) {
        // Nothing may need memory between the folder's making and its entry in folder_.
        name_ = std::string(kPrefix) + "XXXXXX";
        path_ = (std::filesystem::path(place) / name_).string();
        if (!mkdtemp(path_.data())) return errno;
        path_.copy(name_.data(), name_.size(), path_.size() - name_.size());
        folder_.reset(openat(place_.get(), name_.c_str(), O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC));
        if (!folder_ && errno == ENOENT) continue;
        int error = folder_ ? 0 : errno;
        if (error == 0) {
            owner_.reset(openat(folder_.get(), kOwner, O_RDWR | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
            if (!owner_ && errno == ENOENT) continue;
            error = owner_ ? 0 : errno;
        }
        if (error == 0 && !lockNew()) continue;
        if (error == 0) {
            const ssize_t written = write(owner_.get(), record.data(), record.size());
            if (written == static_cast<ssize_t>(record.size())) return 0;
            error = written < 0 ? errno : ENOSPC;
        }
        if (folder_)
            remove();
        else
            unlinkat(place_.get(), name_.c_str(), AT_REMOVEDIR);
        return error;
    }
    folder_.reset();
    owner_.reset();
    return EBUSY;
}

WorkFolder::Removed WorkFolder::remove() {
    Removed removed;
    if (!folder_) return removed;
    unlinkat(folder_.get(), Manifest::kMovingOldIn, 0);
    unlinkat(folder_.get(), Manifest::kMovingNewOut, 0);
    // What is removed while a folder is listed may hide other entries, and where a signal ends the run, its
    // other threads may still make files here. What twice can't be removed, such as a folder that somebody
    // has put there, stays with its owner's name: the next run tries again.
    for (bool stuck = false;;) {
        if (removeOnce(folder_.get(), removed) > 0) {
            stuck = false;
        } else if (holdsMore(folder_.get())) {
            if (std::exchange(stuck, true)) break;
        } else {
            unlinkat(folder_.get(), kOwner, 0);
            if (unlinkat(place_.get(), name_.c_str(), AT_REMOVEDIR) == 0 || errno != ENOTEMPTY) break;
        }
    }
    leave();
    return removed;
}

void WorkFolder::leave() {
    folder_.reset();
    owner_.reset();
    place_.reset();
}
