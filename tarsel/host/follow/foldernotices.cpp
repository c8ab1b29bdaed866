#include "tarsel/host/follow/foldernotices.h"

#include <array>
#include <cerrno>
#include <cstring>

#include <sys/inotify.h>
#include <unistd.h>

FolderNotices::FolderNotices(const std::string& folder) : queue_(::inotify_init1(IN_NONBLOCK | IN_CLOEXEC)) {
    constexpr unsigned wanted = IN_CREATE | IN_CLOSE_WRITE | IN_MOVED_TO | IN_MODIFY | IN_ATTRIB |
                                IN_DELETE_SELF | IN_MOVE_SELF | IN_ONLYDIR;
    if (queue_ && ::inotify_add_watch(queue_.get(), folder.c_str(), wanted) < 0) queue_.reset();
}

bool FolderNotices::take(std::set<std::string>& names) {
    bool all = true;
    alignas(inotify_event) std::array<char, 65536> block{};
    for (;;) {
        const ssize_t got = queue_ ? ::read(queue_.get(), block.data(), block.size()) : 0;
        if (got < 0 && errno == EINTR) continue;
        if (got <= 0) return all;
        for (size_t at = 0; at < static_cast<size_t>(got);) {
            inotify_event event{};
            std::memcpy(&event, &block[at], sizeof event);
            if (event.mask & IN_Q_OVERFLOW) all = false;
            if (event.mask & (IN_DELETE_SELF | IN_MOVE_SELF | IN_UNMOUNT)) gone_ = true;
            if (event.len > 0) names.insert(&block[at + sizeof event]);
            at += sizeof event + event.len;
        }
    }
}
