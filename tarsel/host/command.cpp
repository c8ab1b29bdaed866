#include "tarsel/host/command.h"

#include <cerrno>
#include <csignal>

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

namespace {

// Signals as a fresh process has them, whatever this one blocks or ignores.
struct Fresh {
    Fresh() {
        sigset_t none, all;
        sigemptyset(&none);
        sigfillset(&all);
        posix_spawnattr_init(&attributes);
        posix_spawnattr_setsigmask(&attributes, &none);
        posix_spawnattr_setsigdefault(&attributes, &all);
        posix_spawnattr_setpgroup(&attributes, 0);
        posix_spawnattr_setflags(&attributes,
                                 POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETPGROUP);
        posix_spawn_file_actions_init(&files);
        posix_spawn_file_actions_addopen(&files, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    }
    ~Fresh() {
        posix_spawnattr_destroy(&attributes);
        posix_spawn_file_actions_destroy(&files);
    }
    Fresh(const Fresh&) = delete;
    Fresh& operator=(const Fresh&) = delete;

    posix_spawnattr_t attributes;
    posix_spawn_file_actions_t files;
};

}  // namespace

void ShellCommand::start(const std::string& command) {
    const std::lock_guard guard(lock_);
    const Fresh fresh;
    char shell[] = "sh", option[] = "-c";
    char* const arguments[] = {shell, option, const_cast<char*>(command.c_str()), nullptr};
    if (posix_spawn(&group_, "/bin/sh", &fresh.files, &fresh.attributes, arguments, environ) != 0)
        group_ = -1;
}

ShellCommand::~ShellCommand() {
    wait();
    if (group_ > 0) waitpid(group_, nullptr, 0);
}

int ShellCommand::wait() {
    if (group_ < 0 || ended_) return -1;
    // It keeps its number, so that a signal that comes now reaches no other process.
    siginfo_t info{};
    while (waitid(P_PID, static_cast<id_t>(group_), &info, WEXITED | WNOWAIT) != 0 && errno == EINTR) {
    }
    ended_ = true;
    return info.si_code == CLD_EXITED ? info.si_status : info.si_pid != 0 ? 128 + info.si_status : -1;
}

void ShellCommand::signal(int number) const {
    const std::lock_guard guard(lock_);
    if (group_ > 0) ::kill(-group_, number);
}

void ShellCommand::kill() const { signal(SIGKILL); }
