#include "core/arch/platform.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <algorithm>
#include <cerrno>
#include <memory>

namespace {

struct CloseDir {
    void operator()(DIR* stream) const { closedir(stream); }
};
using Dir = std::unique_ptr<DIR, CloseDir>;

bool leadsToFolder(int parent, const char* name, int followFlag) {
    struct stat facts {};
    return fstatat(parent, name, &facts, followFlag) == 0 && S_ISDIR(facts.st_mode);
}

bool isDots(std::string_view name) { return name == "." || name == ".."; }

// The names first, then the removals: what readdir gives while a folder changes is not defined.
std::vector<std::string> entryNames(DIR* stream) {
    std::vector<std::string> names;
    while (const dirent* entry = readdir(stream))
        if (!isDots(entry->d_name)) names.emplace_back(entry->d_name);
    return names;
}

using Keep = bool (*)(std::string_view);

int removeBelow(int parent, const char* name, Keep keep);

int removeEntry(int folder, const std::string& name, Keep keep) {
    if (!leadsToFolder(folder, name.c_str(), AT_SYMLINK_NOFOLLOW))
        return unlinkat(folder, name.c_str(), 0) == 0 ? 0 : -1;
    return removeBelow(folder, name.c_str(), keep);
}

// Works from open folder to open folder and never by path, so that a folder exchanged for a link while this
// runs can't lead it elsewhere. It needs one descriptor a level: a tree with more levels than the process may
// open files is unchanged, with -1.
int removeBelow(int parent, const char* name, Keep keep) {
    const int descriptor = openat(parent, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    if (descriptor < 0) return -1;
    const Dir stream(fdopendir(descriptor));
    if (!stream) {
        close(descriptor);
        return -1;
    }
    int result = 0;
    for (const std::string& entry : entryNames(stream.get()))
        if (keep && keep(entry))
            result = -1;
        else
            result |= removeEntry(descriptor, entry, keep);
    return result == 0 && unlinkat(parent, name, AT_REMOVEDIR) == 0 ? 0 : -1;
}

}  // namespace

int QvPlatform::listFolder(const char* folder, std::vector<QvFolderEntry>& entries) {
    const Dir stream(opendir(folder));
    if (!stream) return -1;
    const auto first = static_cast<std::ptrdiff_t>(entries.size());
    errno = 0;
    while (const dirent* entry = readdir(stream.get())) {
        // Some file systems don't tell the type, and a link has that of what it leads to.
        const bool asks = entry->d_type == DT_UNKNOWN || entry->d_type == DT_LNK;
        const bool isFolder =
            asks ? leadsToFolder(dirfd(stream.get()), entry->d_name, 0) : entry->d_type == DT_DIR;
        entries.push_back({entry->d_name, isFolder});
        errno = 0;
    }
    if (errno != 0) {  // half a listing would look whole
        entries.resize(static_cast<std::size_t>(first));
        return -1;
    }
    std::sort(entries.begin() + first, entries.end(),
              [](const QvFolderEntry& a, const QvFolderEntry& b) { return a.name < b.name; });
    return 0;
}

int QvPlatform::removeTree(const char* folder, bool (*keep)(std::string_view entry)) {
    // A separator at the end would make the system follow a link.
    std::string name = folder;
    while (name.size() > 1 && name.back() == '/') name.pop_back();
    return removeBelow(AT_FDCWD, name.c_str(), keep);
}
