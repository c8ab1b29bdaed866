#include <fcntl.h>
#include <sys/sendfile.h>
#include <sys/stat.h>
#include <unistd.h>
#include <cerrno>

#include "core/arch/platform.h"

namespace {

// A descriptor that closes itself.
class Descriptor {
  public:
    explicit Descriptor(int number) : number_(number) {}
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    ~Descriptor() {
        if (number_ >= 0) close(number_);
    }
    int get() const { return number_; }
    bool closeChecked() {
        const int number = number_;
        number_ = -1;
        return close(number) == 0;
    }

  private:
    int number_;
};

// Not every file system has the exclusive rename; a link is exclusive everywhere that has links.
int renameExclusive(const char* from, const char* to) {
    if (renameat2(AT_FDCWD, from, AT_FDCWD, to, RENAME_NOREPLACE) == 0) return 0;
    if (errno != EINVAL && errno != ENOSYS) return -1;
    if (link(from, to) == 0) return unlink(from);
    if (errno == EEXIST || errno == EXDEV) return -1;
    struct stat facts {};
    if (lstat(to, &facts) == 0) {
        errno = EEXIST;
        return -1;
    }
    return rename(from, to);
}

int renameAs(const char* from, const char* to, bool replace) {
    return replace ? rename(from, to) : renameExclusive(from, to);
}

bool copyBytes(int from, int to, off_t size) {
    off_t done = 0;
    while (done < size) {
        const ssize_t count = sendfile(to, from, nullptr, std::size_t{1} << 24);
        if (count < 0 && errno == EINTR) continue;
        if (count <= 0) return false;
        done += count;
    }
    return true;
}

// Content, permissions and times, on the disc.
bool copyFile(const char* from, const char* to) {
    const Descriptor source(open(from, O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
    struct stat facts {};
    if (source.get() < 0 || fstat(source.get(), &facts) != 0 || !S_ISREG(facts.st_mode)) return false;
    Descriptor target(open(to, O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    if (target.get() < 0) return false;
    if (!copyBytes(source.get(), target.get(), facts.st_size)) return false;
    // A file that somebody still writes would lose what came after the look at its size.
    struct stat after {};
    if (fstat(source.get(), &after) != 0 || after.st_size != facts.st_size) return false;
    const timespec times[2] = {facts.st_atim, facts.st_mtim};
    (void)fchmod(target.get(), facts.st_mode & 07777);
    (void)futimens(target.get(), times);
    return fsync(target.get()) == 0 && target.closeChecked();
}

// To another disc. The copy has a name of its own in the target's folder until it is complete, so the
// target's name never shows half a file. The source is removed last.
int moveAcross(const char* from, const char* to, bool replace) {
    const std::string partial = std::string(to) + ".partial-" + std::to_string(getpid());
    if (copyFile(from, partial.c_str()) && renameAs(partial.c_str(), to, replace) == 0)
        return unlink(from) == 0 ? 0 : -1;
    unlink(partial.c_str());
    return -1;
}

}  // namespace

int QvPlatform::moveFile(const char* from, const char* to, bool replace) {
    if (renameAs(from, to, replace) == 0) return 0;
    return errno == EXDEV ? moveAcross(from, to, replace) : -1;
}
