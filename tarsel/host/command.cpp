#include "tarsel/host/command.h"

#include <algorithm>
#include <cerrno>
#include <climits>
#include <csignal>
#include <cstring>

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tarsel/host/childprocess.h"
#include "tarsel/words/messages.h"

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
    }
    ~Fresh() {
        posix_spawnattr_destroy(&attributes);
        posix_spawn_file_actions_destroy(&files);
    }
    Fresh(const Fresh&) = delete;
    Fresh& operator=(const Fresh&) = delete;

    void give(int descriptor, int stream) { posix_spawn_file_actions_adddup2(&files, descriptor, stream); }
    void giveNothing(int stream) {
        posix_spawn_file_actions_addopen(&files, stream, "/dev/null", O_RDONLY, 0);
    }

    posix_spawnattr_t attributes;
    posix_spawn_file_actions_t files;
};

std::vector<char*> environmentWithout(const std::vector<std::string>& prefixes) {
    std::vector<char*> kept;
    for (char** one = environ; *one; ++one)
        if (std::none_of(prefixes.begin(), prefixes.end(), [&](const std::string& prefix) {
                return std::strncmp(*one, prefix.c_str(), prefix.size()) == 0;
            }))
            kept.push_back(*one);
    kept.push_back(nullptr);
    return kept;
}

// False if it took longer. It is waited for in either case.
bool endsWithin(pid_t process, double seconds, int& status) {
    const Descriptor handle(static_cast<int>(syscall(SYS_pidfd_open, process, 0)));
    pollfd end{handle.get(), POLLIN, 0};
    int ready;
    do ready = handle ? poll(&end, 1, static_cast<int>(seconds * 1000)) : -1;
    while (ready < 0 && handle && errno == EINTR);
    if (ready <= 0) kill(-process, SIGKILL);
    while (waitpid(process, &status, 0) < 0 && errno == EINTR) {
    }
    return ready > 0;
}

}  // namespace

void ShellCommand::start(const std::string& command) {
    const std::lock_guard guard(lock_);
    Fresh fresh;
    fresh.giveNothing(STDIN_FILENO);
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

Answer askProgram(const std::vector<std::string>& words, const std::string& input, double seconds,
                  const std::vector<std::string>& without) {
    const Descriptor streams[] = {fileInMemory(input), fileInMemory(), fileInMemory()};
    Fresh fresh;
    for (int stream = 0; stream <= STDERR_FILENO; ++stream) fresh.give(streams[stream].get(), stream);
    std::vector<char*> arguments;
    for (const std::string& word : words) arguments.push_back(const_cast<char*>(word.c_str()));
    arguments.push_back(nullptr);
    pid_t process;
    const int error = posix_spawnp(&process, arguments[0], &fresh.files, &fresh.attributes, arguments.data(),
                                   environmentWithout(without).data());
    if (error == ENOENT) throw failure(Msg::programMissing, {words[0]});
    if (error != 0) throw systemFailure(Msg::childNotStarted, words[0], error);
    int status = 0;
    if (!endsWithin(process, seconds, status))
        throw failure(Msg::programSilent, {words[0], std::to_string(static_cast<int>(seconds))});
    return {WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status), contentsOf(streams[1]),
            contentsOf(streams[2])};
}

std::string ownProgram() {
    char name[PATH_MAX];
    const ssize_t length = readlink("/proc/self/exe", name, sizeof name);
    return length > 0 ? std::string(name, static_cast<size_t>(length)) : "tarsel";
}
