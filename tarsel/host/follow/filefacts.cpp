#include "tarsel/host/follow/filefacts.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include <crypto++/sha.h>
#include <dirent.h>
#include <fcntl.h>
#include <linux/magic.h>
#include <sys/stat.h>
#include <sys/vfs.h>
#include <unistd.h>

#include "tarsel/host/descriptor.h"
#include "tarsel/host/files.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

FileFacts::Kind kindOf(mode_t mode) {
    if (S_ISREG(mode)) return FileFacts::Kind::file;
    if (S_ISDIR(mode)) return FileFacts::Kind::folder;
    return S_ISLNK(mode) ? FileFacts::Kind::link : FileFacts::Kind::other;
}

// Whether the open file N of a process, "/proc/PID/fdinfo/N", can be written through.
bool opensForWriting(const std::string& info) {
    FILE* const file = std::fopen(info.c_str(), "re");
    if (!file) return false;
    unsigned flags = 0;
    char line[128];
    while (std::fgets(line, sizeof line, file))
        if (std::sscanf(line, "flags: %o", &flags) == 1) break;
    std::fclose(file);
    return (flags & O_ACCMODE) != O_RDONLY;
}

// Of the processes that this one may look into.
bool someProcessWrites(const FileFacts& facts) {
    std::error_code error;
    for (fs::directory_iterator process("/proc", error), end; !error && process != end;
         process.increment(error)) {
        const std::string folder = process->path().string();
        if (folder.find_first_not_of("0123456789", sizeof "/proc/" - 1) != std::string::npos) continue;
        std::error_code closed;
        for (fs::directory_iterator open(folder + "/fd", closed); !closed && open != end;
             open.increment(closed)) {
            struct stat status {};
            if (::stat(open->path().c_str(), &status) != 0 || status.st_ino != facts.inode ||
                status.st_dev != facts.device)
                continue;
            if (opensForWriting(folder + "/fdinfo/" + open->path().filename().string())) return true;
        }
    }
    return false;
}

}  // namespace

FileFacts factsOf(const std::string& path) {
    struct stat status {};
    if (::lstat(path.c_str(), &status) != 0) return {};
    FileFacts facts;
    facts.kind = kindOf(status.st_mode);
    facts.bytes = status.st_size;
    facts.modified = status.st_mtim.tv_sec * 1000000000LL + status.st_mtim.tv_nsec;
    facts.device = status.st_dev;
    facts.inode = status.st_ino;
    return facts;
}

std::vector<std::string> namesIn(const std::string& folder) {
    DIR* const entries = ::opendir(folder.c_str());
    if (!entries) throw systemFailure(Msg::watchNoFolder, folder, errno);
    std::vector<std::string> names;
    errno = 0;
    while (const dirent* entry = ::readdir(entries)) {
        const std::string name = entry->d_name;
        if (name != "." && name != "..") names.push_back(name);
    }
    const int error = errno;
    ::closedir(entries);
    if (error != 0) throw systemFailure(Msg::watchNoFolder, folder, error);
    return names;
}

// A read lease is refused while anyone has the file open for writing. It is given back at once; another
// process that opens the file in between waits that long, and this one gets a signal that it ignores.
bool isBeingWritten(const std::string& file) {
    static const bool ignored = std::signal(SIGIO, SIG_IGN) != SIG_ERR;
    const Descriptor open(::open(file.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC | O_NOFOLLOW));
    if (!open || !ignored) return false;
    if (::fcntl(open.get(), F_SETLEASE, F_RDLCK) == 0) {
        ::fcntl(open.get(), F_SETLEASE, F_UNLCK);
        return false;
    }
    return errno == EAGAIN || someProcessWrites(factsOf(file));
}

bool isNetworkFolder(const std::string& folder) {
    constexpr std::array<unsigned long, 8> remote = {NFS_SUPER_MAGIC,  SMB_SUPER_MAGIC, SMB2_SUPER_MAGIC,
                                                     CIFS_SUPER_MAGIC, AFS_SUPER_MAGIC, CODA_SUPER_MAGIC,
                                                     V9FS_MAGIC,       FUSE_SUPER_MAGIC};
    struct statfs system {};
    if (::statfs(folder.c_str(), &system) != 0) return false;
    for (const unsigned long magic : remote)
        if (static_cast<unsigned long>(system.f_type) == magic) return true;
    return false;
}

std::optional<std::string> digestOf(const std::string& file, const std::function<bool()>& stop) {
    const Descriptor open(::open(file.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
    if (!open) throw systemFailure(Msg::inputSystem, file, errno);
    CryptoPP::SHA256 digest;
    std::vector<unsigned char> block(1 << 20);
    for (;;) {
        if (stop()) return std::nullopt;
        const ssize_t got = ::read(open.get(), block.data(), block.size());
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) throw systemFailure(Msg::inputSystem, file, errno);
        if (got == 0) break;
        digest.Update(block.data(), static_cast<size_t>(got));
    }
    std::array<unsigned char, CryptoPP::SHA256::DIGESTSIZE> bytes{};
    digest.Final(bytes.data());
    std::string text;
    for (const unsigned char byte : bytes) {
        constexpr char digits[] = "0123456789abcdef";
        text += digits[byte >> 4];
        text += digits[byte & 15];
    }
    return text;
}

std::string realName(const std::string& name) {
    std::error_code error;
    std::string real = fs::weakly_canonical(fs::absolute(name), error).string();
    if (error) real = absoluteName(name);
    while (real.size() > 1 && real.ends_with('/')) real.pop_back();
    return real;
}

bool isWithin(const std::string& inner, const std::string& outer) {
    return inner == outer || inner.starts_with(outer.ends_with('/') ? outer : outer + "/");
}

void makeFolders(const std::string& folder) {
    std::error_code error;
    fs::create_directories(folder, error);
    if (error) throw systemFailure(Msg::outputSystem, folder, error.value());
}
