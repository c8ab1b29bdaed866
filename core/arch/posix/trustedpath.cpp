#include "core/arch/posix/trustedpath_p.h"

#include <grp.h>
#include <pwd.h>
#include <sys/stat.h>
#include <sys/xattr.h>
#include <unistd.h>
#include <cerrno>
#include <climits>
#include <cstring>

namespace {

// An entry of the user or group database, whose operation fills a buffer that has to be large enough.
template <class Entry, class Id>
const Entry* lookUp(int (*ask)(Id, Entry*, char*, std::size_t, Entry**), Id id, Entry& entry,
                    std::vector<char>& buffer) {
    buffer.resize(1024);
    Entry* found = nullptr;
    while (ask(id, &entry, buffer.data(), buffer.size(), &found) == ERANGE &&
           buffer.size() < (std::size_t{1} << 20))
        buffer.resize(buffer.size() * 2);
    return found;
}

// True if members of the group are this user and root alone: root's group, and the group of the user's own
// that most systems make with the user. It has the user's name; a system without names gives it the user's
// number. A group without members in its list can still have some: users whose primary group it is are not
// listed.
bool isPrivate(gid_t group) {
    std::vector<char> groupText, userText;
    struct group groupEntry {};
    passwd userEntry{};
    const auto* const groupFacts = lookUp(getgrgid_r, group, groupEntry, groupText);
    const auto* const userFacts = lookUp(getpwuid_r, geteuid(), userEntry, userText);
    const std::string_view user = userFacts ? userFacts->pw_name : "";
    for (char** member = groupFacts ? groupFacts->gr_mem : nullptr; member && *member; ++member)
        if (*member != user && *member != std::string_view("root")) return false;
    if (group == 0) return true;
    return groupFacts && userFacts ? groupFacts->gr_name == user : group == geteuid();
}

bool isOurs(const struct stat& facts) { return facts.st_uid == 0 || facts.st_uid == geteuid(); }

bool othersMayWrite(const struct stat& facts, const std::string& name) {
    if (facts.st_mode & S_IWOTH) return true;
    if (!(facts.st_mode & S_IWGRP)) return false;
    // With an access list the group's bit says that anybody may be in the list.
    return getxattr(name.c_str(), "system.posix_acl_access", nullptr, 0) > 0 || !isPrivate(facts.st_gid);
}

std::string systemReason(int code) { return std::string("can't be opened: ") + std::strerror(code); }

// Goes from the root through one part of the name after the other. It checks the permissions to write before
// it looks into a folder; so nobody else can exchange what comes after, and names will do where open folders
// were needed otherwise.
class Walk {
  public:
    explicit Walk(QvLibraryTrust trust) : checks_(trust == QvLibraryTrust::owner) {}

    QvFoundFile to(const std::string& name) {
        rest_ = name;
        while (result_.reason.empty() && result_.name.empty()) step();
        return result_;
    }

  private:
    void refuse(QvLibraryFault fault, const std::string& reason) {
        result_.fault = fault;
        result_.reason = reason;
    }

    std::string nextPart() {
        const std::size_t begin = std::min(rest_.find_first_not_of('/'), rest_.size());
        const std::size_t end = std::min(rest_.find('/', begin), rest_.size());
        const std::string part = rest_.substr(begin, end - begin);
        rest_.erase(0, std::min(rest_.find_first_not_of('/', end), rest_.size()));
        return part;
    }

    void step() {
        const std::string part = nextPart();
        if (part == "..") folder_.erase(std::min(folder_.rfind('/'), folder_.size()));
        if (part.empty() || (rest_.empty() && (part == "." || part == "..")))
            return refuse(QvLibraryFault::invalid, "is a folder");
        if (part == "." || part == ".." || !folderIsSafe()) return;
        const std::string name = folder_ + "/" + part;
        struct stat facts {};
        if (lstat(name.c_str(), &facts) != 0) return refuseAbsent(errno);
        if (checks_ && !isOurs(facts))
            return refuse(S_ISDIR(facts.st_mode) ? QvLibraryFault::unsafeFolder : QvLibraryFault::unsafe,
                          what(facts, name) + "belongs to another user");
        if (S_ISLNK(facts.st_mode))
            follow(name);
        else if (!rest_.empty())
            folder_ = name;  // if it is no folder, the next part is not found
        else
            end(name, facts);
    }

    // In a folder such as /tmp, where everybody may write but only to their own, what is ours is safe. Where
    // the file itself is, others may not even add a file: the loader may take it for a dependency.
    bool folderIsSafe() {
        if (!checks_) return true;
        const std::string folder = folder_.empty() ? "/" : folder_;
        struct stat facts {};
        if (stat(folder.c_str(), &facts) != 0) {
            refuseAbsent(errno);
        } else if (!isOurs(facts)) {
            refuse(QvLibraryFault::unsafeFolder,
                   "is in the folder '" + folder + "', which belongs to another user");
        } else if ((rest_.empty() || !(facts.st_mode & S_ISVTX)) && othersMayWrite(facts, folder)) {
            refuse(QvLibraryFault::unsafeFolder,
                   "is in the folder '" + folder + "', to which other users may write");
        }
        return result_.reason.empty();
    }

    static std::string what(const struct stat& facts, const std::string& name) {
        return S_ISLNK(facts.st_mode)   ? "is reached by the link '" + name + "', which "
               : S_ISDIR(facts.st_mode) ? "is in the folder '" + name + "', which "
                                        : "";
    }

    void refuseAbsent(int code) {
        const char* const absent = isLink_ ? "is a link that leads nowhere" : "does not exist";
        refuse(QvLibraryFault::unreadable, code == ENOENT ? absent : systemReason(code));
    }

    void follow(const std::string& link) {
        constexpr int most = 40;  // the system's own bound
        char target[PATH_MAX];
        const ssize_t length = readlink(link.c_str(), target, sizeof target);
        if (length < 0 || ++links_ > most) return refuseAbsent(length < 0 ? errno : ELOOP);
        isLink_ = isLink_ || rest_.empty();
        if (target[0] == '/') folder_.clear();
        rest_ = std::string(target, static_cast<std::size_t>(length)) + (rest_.empty() ? "" : "/" + rest_);
    }

    void end(const std::string& name, const struct stat& facts) {
        if (S_ISDIR(facts.st_mode)) return refuse(QvLibraryFault::invalid, "is a folder");
        if (!S_ISREG(facts.st_mode))
            return refuse(QvLibraryFault::invalid,
                          S_ISFIFO(facts.st_mode) ? "is a pipe" : "is not a regular file");
        if (checks_ && othersMayWrite(facts, name))
            return refuse(QvLibraryFault::unsafe, "can be written to by other users");
        result_.name = name;
    }

    const bool checks_;
    std::string folder_;  // where the walk is, without links; "" is the root
    std::string rest_;    // of the name, without separators in front
    int links_ = 0;
    bool isLink_ = false;  // the file itself, not a folder on the way
    QvFoundFile result_;
};

}  // namespace

QvFoundFile qvFindLibrary(const std::string& name, QvLibraryTrust trust) {
    Walk walk(trust);
    if (name.empty()) return {"", QvLibraryFault::unreadable, "does not exist"};
    return walk.to(name.front() == '/' ? name : qv_platform().currentFolder() + "/" + name);
}
