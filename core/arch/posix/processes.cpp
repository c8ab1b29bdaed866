#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <cerrno>
#include <csignal>

#include "core/arch/platform.h"

extern char** environ;

namespace {

// Signals as a fresh process has them, whatever this thread blocks or the application ignores; and nothing to
// read, since a command that asks a question would wait for ever in an unattended run.
class SpawnSetup {
  public:
    SpawnSetup() {
        posix_spawnattr_init(&attributes);
        sigset_t none, all;
        sigemptyset(&none);
        sigfillset(&all);
        posix_spawnattr_setsigmask(&attributes, &none);
        posix_spawnattr_setsigdefault(&attributes, &all);
        posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF);
        posix_spawn_file_actions_init(&actions);
        posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
    }
    SpawnSetup(const SpawnSetup&) = delete;
    SpawnSetup& operator=(const SpawnSetup&) = delete;
    ~SpawnSetup() {
        posix_spawnattr_destroy(&attributes);
        posix_spawn_file_actions_destroy(&actions);
    }

    posix_spawnattr_t attributes;
    posix_spawn_file_actions_t actions;
};

int exitCode(int status) {
    if (WIFEXITED(status)) return WEXITSTATUS(status);
    return WIFSIGNALED(status) ? 128 + WTERMSIG(status) : -1;
}

}  // namespace

int QvPlatform::runCommand(const char* command) {
    if (!*command) return -1;
    const SpawnSetup setup;
    char shell[] = "sh", option[] = "-c";
    char* const arguments[] = {shell, option, const_cast<char*>(command), nullptr};
    pid_t child = 0;
    if (posix_spawn(&child, "/bin/sh", &setup.actions, &setup.attributes, arguments, environ) != 0) return -1;
    int status = 0;
    pid_t ended;
    do ended = waitpid(child, &status, 0);
    while (ended < 0 && errno == EINTR);
    return ended == child ? exitCode(status) : -1;
}

std::string QvPlatform::quoteForShell(std::string_view name) {
    std::string out = "'";
    if (!name.empty() && name.front() == '-') out += "./";
    for (const char c : name)
        if (c == '\'')
            out += "'\\''";
        else
            out += c;
    return out + "'";
}
