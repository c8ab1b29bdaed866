#include "tarsel/host/outputs/sharedfile.h"

#include <cerrno>
#include <cstdio>
#include <filesystem>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tarsel/host/outputs/foldercalls.h"

namespace fs = std::filesystem;

namespace {

constexpr mode_t kNewFile = 0666;  // less what the user's mask takes away

// Of a name that is a symbolic link, the place that it leads to, be there a file or not.
fs::path placeOf(fs::path name) {
    constexpr int mostLinks = 40;
    std::error_code error;
    for (int i = 0; i < mostLinks && fs::is_symlink(name, error); ++i) {
        const fs::path to = fs::read_symlink(name, error);
        if (error) break;
        name = name.parent_path() / to;
    }
    return name;
}

int lockFile(int descriptor) {
    int result;
    do result = flock(descriptor, LOCK_EX);
    while (result != 0 && errno == EINTR);
    return result == 0 ? 0 : errno;
}

// The new file is for those for whom the old one was.
int keepMode(const fs::path& from, const fs::path& to) {
    struct stat old;
    if (stat(from.c_str(), &old) != 0) return errno == ENOENT ? 0 : errno;
    return chmod(to.c_str(), old.st_mode & 07777) == 0 ? 0 : errno;
}

}  // namespace

SharedFile::SharedFile(const std::string& name, Msg refused)
    : name_(placeOf(name).string()), refused_(refused) {
    if (const fs::path folder = fs::path(name_).parent_path(); !folder.empty()) {
        std::error_code error;
        fs::create_directories(folder, error);
        if (error) throw systemFailure(refused_, folder.string(), error.value());
    }
    const std::string lock = name_ + ".lock";
    lock_.reset(open(lock.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, kNewFile));
    const int result = lock_ ? lockFile(lock_.get()) : errno;
    if (result != 0) throw systemFailure(refused_, lock, result);
}

void SharedFile::replace(const std::function<void(const std::string& name)>& write) {
    const fs::path place = name_, folder = place.parent_path();
    const std::string entry = place.filename().string(), freshEntry = entry + ".new", fresh = name_ + ".new";
    unlink(fresh.c_str());  // of a run that was ended
    int result = 0;
    try {
        write(fresh);
        const Descriptor open(openFolder(folder.empty() ? "." : folder.c_str()));
        if (!open) result = errno;
        if (result == 0) result = keepMode(place, fresh);
        if (result == 0) result = syncFile(open.get(), freshEntry.c_str());
        if (result == 0) result = renameOver(open.get(), freshEntry.c_str(), open.get(), entry.c_str());
        if (result == 0) result = syncFolder(open.get());
        if (result != 0) throw systemFailure(refused_, name_, result);
    } catch (...) {
        unlink(fresh.c_str());
        throw;
    }
}
