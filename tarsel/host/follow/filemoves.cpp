#include "tarsel/host/follow/filemoves.h"

#include <cerrno>
#include <cstdio>
#include <filesystem>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tarsel/host/descriptor.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

[[noreturn]] void refuse(const std::string& name, int error) {
    throw systemFailure(Msg::outputSystem, name, error);
}

void requireSame(const std::string& file, const FileFacts& facts) {
    if (factsOf(file) != facts) throw failure(Msg::watchChanged, {file});
}

// 0, or an errno; EEXIST where the new name is taken.
int renameToNew(const std::string& from, const std::string& to) {
    if (::renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), RENAME_NOREPLACE) == 0) return 0;
    if (errno != EINVAL && errno != ENOSYS) return errno;
    // A file system that does not know the flag: the name is taken first.
    if (::link(from.c_str(), to.c_str()) == 0) return ::unlink(from.c_str()) == 0 ? 0 : errno;
    if (errno == EEXIST || errno == EXDEV) return errno;
    const Descriptor place(::open(to.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    if (!place) return errno;
    if (::rename(from.c_str(), to.c_str()) == 0) return 0;
    const int error = errno;
    ::unlink(to.c_str());
    return error;
}

int writeAll(int to, const char* bytes, size_t count) {
    while (count > 0) {
        const ssize_t written = ::write(to, bytes, count);
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) return errno;
        bytes += written;
        count -= static_cast<size_t>(written);
    }
    return 0;
}

int copyBytes(int from, int to) {
    std::string block(1 << 20, '\0');
    for (;;) {
        const ssize_t got = ::read(from, block.data(), block.size());
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) return errno;
        if (got == 0) return 0;
        if (const int error = writeAll(to, block.data(), static_cast<size_t>(got)); error != 0) return error;
    }
}

// A copy on the disk, with the times and rights of the file. 0 or an errno; then there is none.
int copyTo(const std::string& file, const std::string& copy) {
    const Descriptor from(::open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
    struct stat status {};
    if (!from || ::fstat(from.get(), &status) != 0) return errno;
    const Descriptor to(::open(copy.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC | O_NOFOLLOW, 0600));
    if (!to) return errno;
    int error = copyBytes(from.get(), to.get());
    const timespec times[] = {status.st_atim, status.st_mtim};
    if (error == 0 && ::fsync(to.get()) != 0 && errno != EINVAL) error = errno;
    // A file system need not have them.
    [[maybe_unused]] const bool dated = ::futimens(to.get(), times) == 0;
    [[maybe_unused]] const bool allowed = ::fchmod(to.get(), status.st_mode & 0777) == 0;
    if (error != 0) ::unlink(copy.c_str());
    return error;
}

// The n-th name that is tried for a file.
fs::path numbered(const fs::path& folder, const fs::path& file, int n) {
    if (n == 1) return folder / file.filename();
    return folder / (file.stem().string() + " (" + std::to_string(n) + ")" + file.extension().string());
}

template <class Place>
std::string placed(const fs::path& folder, const std::string& file, Place place) {
    constexpr int most = 100000;
    for (int n = 1; n < most; ++n) {
        const std::string name = numbered(folder, file, n).string();
        const int error = place(name);
        if (error == 0) return name;
        if (error != EEXIST) refuse(name, error);
    }
    refuse(file, EEXIST);
}

}  // namespace

std::string moveInto(const std::string& file, const std::string& folder, const FileFacts& facts) {
    makeFolders(folder);
    requireSame(file, facts);
    bool elsewhere = false;
    std::string name = placed(folder, file, [&](const std::string& to) {
        const int error = renameToNew(file, to);
        elsewhere = error == EXDEV;
        return elsewhere ? 0 : error;
    });
    if (elsewhere) {
        const std::string part = (fs::path(folder) / ("." + fs::path(file).filename().string())).string() +
                                 "." + std::to_string(::getpid()) + ".part";
        if (const int error = copyTo(file, part); error != 0) refuse(part, error);
        if (factsOf(file) != facts) {
            ::unlink(part.c_str());
            throw failure(Msg::watchChanged, {file});
        }
        try {
            name = placed(folder, file, [&](const std::string& to) { return renameToNew(part, to); });
        } catch (const Failure&) {
            ::unlink(part.c_str());
            throw;
        }
        syncFolder(folder);
        if (::unlink(file.c_str()) != 0) refuse(file, errno);
    }
    syncFolder(folder);
    syncFolder(fs::path(file).parent_path().string());
    return name;
}

void removeFile(const std::string& file, const FileFacts& facts) {
    requireSame(file, facts);
    if (::unlink(file.c_str()) != 0) refuse(file, errno);
    syncFolder(fs::path(file).parent_path().string());
}

void writeNewFile(const std::string& name, const std::string& text) {
    const Descriptor file(::open(name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666));
    if (!file) refuse(name, errno);
    int error = writeAll(file.get(), text.data(), text.size());
    if (error == 0 && ::fsync(file.get()) != 0 && errno != EINVAL) error = errno;
    if (error == 0) return;
    ::unlink(name.c_str());
    refuse(name, error);
}

void syncFolder(const std::string& folder) {
    const Descriptor open(::open(folder.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (open) ::fsync(open.get());
}
