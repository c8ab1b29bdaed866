#include "tarsel/host/outputs/attributes.h"

#include <cerrno>
#include <string>

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>

#include "tarsel/host/descriptor.h"

namespace {

constexpr const char* kAccessList = "system.posix_acl_access";

// False if the old file has a list that the new one could not take.
bool keepAccessList(int from, int to) {
    // An open path has no attributes itself, but its name in /proc leads to the file.
    const std::string name = "/proc/self/fd/" + std::to_string(from);
    char list[4096];
    const ssize_t size = getxattr(name.c_str(), kAccessList, list, sizeof list);
    if (size < 0) return errno == ENODATA || errno == ENOTSUP;
    return fsetxattr(to, kAccessList, list, static_cast<size_t>(size), 0) == 0;
}

}  // namespace

int keepAttributes(int work, const char* fresh, int place, const char* old) {
    const Descriptor from(openat(place, old, O_PATH | O_NOFOLLOW | O_CLOEXEC));
    struct stat was, is;
    if (!from || fstat(from.get(), &was) != 0 || !S_ISREG(was.st_mode)) return 0;
    const Descriptor to(openat(work, fresh, O_RDONLY | O_NOFOLLOW | O_CLOEXEC));
    if (!to || fstat(to.get(), &is) != 0) return errno;
    bool groupKept = true;
    if ((is.st_uid != was.st_uid || is.st_gid != was.st_gid) && fchown(to.get(), was.st_uid, was.st_gid) != 0)
        groupKept = is.st_gid == was.st_gid || fchown(to.get(), static_cast<uid_t>(-1), was.st_gid) == 0;
    mode_t mode = was.st_mode & 0777;
    const bool listKept = keepAccessList(from.get(), to.get());
    if (!groupKept || !listKept) mode &= ~static_cast<mode_t>(070) | (mode & 07) << 3;
    if (mode == (is.st_mode & 07777)) return 0;
    return fchmod(to.get(), mode) == 0 ? 0 : errno;
}
