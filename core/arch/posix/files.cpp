#include "core/arch/platform.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>
#include <cerrno>
#include <limits>

namespace {

// -1 for what is no mode of fopen.
int openFlags(const char* mode) {
    const bool update = std::string_view(mode).find('+') != std::string_view::npos;
    const int access = update ? O_RDWR : mode[0] == 'r' ? O_RDONLY : O_WRONLY;
    switch (mode[0]) {
        case 'r': return access | O_CLOEXEC;
        case 'w': return access | O_CLOEXEC | O_CREAT | O_TRUNC;
        case 'a': return access | O_CLOEXEC | O_CREAT | O_APPEND;
        default: return -1;
    }
}

int openRetrying(const char* name, int flags) {
    int descriptor;
    do descriptor = open(name, flags, 0666);
    while (descriptor < 0 && errno == EINTR);
    return descriptor;
}

// A folder opens for reading but can't be read; refused here, it fails where the caller looks.
int openNoFolder(const char* name, int flags) {
    const int descriptor = openRetrying(name, flags);
    if (descriptor < 0) return -1;
    struct stat facts {};
    if (fstat(descriptor, &facts) == 0 && !S_ISDIR(facts.st_mode)) return descriptor;
    close(descriptor);
    errno = EISDIR;
    return -1;
}

std::string folderAbove(const std::string& name) {
    const std::size_t end = name.find_last_not_of('/');
    if (end == std::string::npos) return "";
    const std::size_t slash = name.rfind('/', end);
    if (slash == std::string::npos) return name == "." ? "" : ".";
    return slash == 0 ? "/" : name.substr(0, slash);
}

}  // namespace

std::FILE* QvPlatform::openFile(const char* name, const char* mode) {
    const int flags = openFlags(mode);
    const int descriptor = flags == -1 ? -1 : openNoFolder(name, flags);
    if (descriptor < 0) return nullptr;
    std::string plain(1, mode[0]);
    if ((flags & O_ACCMODE) == O_RDWR) plain += '+';
    std::FILE* const file = fdopen(descriptor, plain.c_str());
    if (!file) close(descriptor);
    return file;
}

int QvPlatform::openDescriptor(const char* name, bool writing) {
    return openNoFolder(name, openFlags(writing ? "w" : "r"));
}

void QvPlatform::closeDescriptor(int descriptor) { close(descriptor); }

int QvPlatform::seek(std::FILE* file, long long offset, int origin) {
    return fseeko(file, static_cast<off_t>(offset), origin) == 0 ? 0 : -1;
}

long long QvPlatform::tell(std::FILE* file) { return ftello(file); }

int QvPlatform::sync(std::FILE* file) {
    if (std::fflush(file) != 0) return -1;
    const int descriptor = fileno(file);
    if (descriptor < 0) return -1;
    // Pipes and some network discs have nothing to bring home; that is no failure of the data.
    return fsync(descriptor) == 0 || errno == EINVAL || errno == EROFS ? 0 : -1;
}

bool QvPlatform::status(const char* name, QvFileStatus& status) {
    struct stat facts {};
    if (stat(name, &facts) != 0) return false;
    status.isFolder = S_ISDIR(facts.st_mode);
    status.isRegular = S_ISREG(facts.st_mode);
    status.size = facts.st_size;
    status.modifiedNs = static_cast<long long>(facts.st_mtim.tv_sec) * 1'000'000'000 + facts.st_mtim.tv_nsec;
    return true;
}

bool QvPlatform::sameFile(const char* first, const char* second) {
    struct stat a {
    }, b{};
    return stat(first, &a) == 0 && stat(second, &b) == 0 && a.st_dev == b.st_dev && a.st_ino == b.st_ino;
}

int QvPlatform::removeFile(const char* name) { return unlink(name) == 0 ? 0 : -1; }

int QvPlatform::removeFolder(const char* name) { return ::rmdir(name) == 0 ? 0 : -1; }

int QvPlatform::makeFolder(const char* name) {
    if (::mkdir(name, 0777) == 0) return 0;
    struct stat facts {};
    return errno == EEXIST && stat(name, &facts) == 0 && S_ISDIR(facts.st_mode) ? 0 : -1;
}

long long QvPlatform::freeSpace(const char* name) {
    struct statvfs facts {};
    std::string place = name;
    while (!place.empty() && statvfs(place.c_str(), &facts) != 0) {
        if (errno != ENOENT && errno != ENOTDIR) return -1;
        place = folderAbove(place);
    }
    if (place.empty() || facts.f_blocks == 0) return -1;  // pipes and the like have no disc
    const unsigned long long bytes = 1ull * facts.f_bavail * facts.f_frsize;
    constexpr auto most = static_cast<unsigned long long>(std::numeric_limits<long long>::max());
    return static_cast<long long>(bytes < most ? bytes : most);
}

std::string QvPlatform::currentFolder() {
    std::string folder(256, '\0');
    while (!getcwd(folder.data(), folder.size())) {
        if (errno != ERANGE) return "";
        folder.resize(folder.size() * 2);
    }
    folder.resize(folder.find('\0'));
    return folder;
}
