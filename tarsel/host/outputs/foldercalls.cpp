#include "tarsel/host/outputs/foldercalls.h"

#include <cerrno>
#include <cstdio>
#include <memory>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tarsel/host/descriptor.h"

namespace {

// Of a call that returns 0 or sets errno; one that the file system does not know has nothing to do.
int syncResult(int result) {
    if (result == 0) return 0;
    const bool unknown = errno == EINVAL || errno == EROFS || errno == ENOTSUP || errno == ENOSYS;
    return unknown ? 0 : errno;
}

template <class Call>
int repeated(Call call) {
    int result;
    do result = call();
    while (result != 0 && errno == EINTR);
    return result;
}

}  // namespace

int openFolder(const char* name) {
    const int folder = open(name, O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (folder >= 0 || errno != EACCES) return folder;
    return open(name, O_PATH | O_DIRECTORY | O_CLOEXEC);
}

bool isEntryName(std::string_view name) {
    return !name.empty() && name != "." && name != ".." && name.find('/') == std::string_view::npos &&
           name.find('\0') == std::string_view::npos;
}

bool entryExists(int folder, const char* name) {
    struct stat status;
    return fstatat(folder, name, &status, AT_SYMLINK_NOFOLLOW) == 0;
}

bool isRemoved(int folder) {
    struct stat status;
    return fstat(folder, &status) == 0 && status.st_nlink == 0;
}

int listFolder(int folder, std::vector<std::string>& names) {
    // A further descriptor, so that the place in the listing is its own.
    Descriptor own(openat(folder, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!own) return errno;
    struct Close {
        void operator()(DIR* listing) const { closedir(listing); }
    };
    const std::unique_ptr<DIR, Close> listing(fdopendir(own.get()));
    if (!listing) return errno;
    own.release();
    errno = 0;
    while (const dirent* entry = readdir(listing.get()))
        if (isEntryName(entry->d_name)) names.emplace_back(entry->d_name);
    return errno;
}

int moveEntry(int from, const char* name, int to, const char* newName) {
    if (renameat2(from, name, to, newName, RENAME_NOREPLACE) == 0) return 0;
    if (errno != EINVAL) return errno;
    if (entryExists(to, newName)) return EEXIST;
    return renameOver(from, name, to, newName);
}

int renameOver(int from, const char* name, int to, const char* newName) {
    return renameat2(from, name, to, newName, 0) == 0 ? 0 : errno;
}

int exchangeEntries(int first, const char* name, int second, const char* otherName) {
    return renameat2(first, name, second, otherName, RENAME_EXCHANGE) == 0 ? 0 : errno;
}

int syncFile(int folder, const char* name) {
    const Descriptor file(openat(folder, name, O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
    if (!file) return errno;
    return syncResult(repeated([&] { return fdatasync(file.get()); }));
}

int syncFolder(int folder) {
    const int result = repeated([&] { return fsync(folder); });
    // One that may not be read can't be synchronised.
    if (result != 0 && errno == EBADF) return 0;
    return syncResult(result);
}

int syncFileSystem(int folder) {
    return syncResult(repeated([&] { return syncfs(folder); }));
}

int writeEntry(int folder, const char* name, std::string_view bytes) {
    const Descriptor file(openat(folder, name, O_WRONLY | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0600));
    if (!file) return errno;
    while (!bytes.empty()) {
        const ssize_t written = write(file.get(), bytes.data(), bytes.size());
        if (written < 0 && errno == EINTR) continue;
        if (written <= 0) return written < 0 ? errno : ENOSPC;
        bytes.remove_prefix(static_cast<size_t>(written));
    }
    return 0;
}

int readEntry(int folder, const char* name, size_t most, std::string& bytes) {
    // Not blocking: anything may stand there.
    const Descriptor file(openat(folder, name, O_RDONLY | O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC));
    if (!file) return errno;
    struct stat status;
    if (fstat(file.get(), &status) != 0) return errno;
    if (!S_ISREG(status.st_mode)) return EINVAL;
    char block[4096];
    for (;;) {
        const ssize_t got = read(file.get(), block, sizeof block);
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) return got < 0 ? errno : 0;
        if (bytes.size() + static_cast<size_t>(got) > most) return EFBIG;
        bytes.append(block, static_cast<size_t>(got));
    }
}
