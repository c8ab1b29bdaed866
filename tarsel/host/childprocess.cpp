#include "tarsel/host/childprocess.h"

#include <cerrno>
#include <climits>
#include <csignal>

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include "tarsel/words/messages.h"

namespace {

// Between fork and exec nothing but calls that need no lock and no memory.
[[noreturn]] void becomeProgram(char* const* words, int output, int nowhere, int handed, pid_t parent) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() != parent) _exit(127);  // it has ended before that was set
    setpgid(0, 0);
    for (const int number : {SIGPIPE, SIGXFSZ}) ::signal(number, SIG_DFL);
    sigset_t none;
    sigemptyset(&none);
    pthread_sigmask(SIG_SETMASK, &none, nullptr);
    if (dup2(nowhere, STDIN_FILENO) < 0 || dup2(output, STDOUT_FILENO) < 0 || dup2(output, STDERR_FILENO) < 0)
        _exit(127);
    if (handed == ChildProcess::kHanded ? fcntl(handed, F_SETFD, 0) != 0
                                        : dup2(handed, ChildProcess::kHanded) < 0)
        _exit(127);
    execv(words[0], words);
    _exit(127);
}

}  // namespace

ChildProcess::ChildProcess(const std::vector<std::string>& words, const Descriptor& handed) {
    std::vector<char*> arguments;
    for (const std::string& word : words) arguments.push_back(const_cast<char*>(word.c_str()));
    arguments.push_back(nullptr);
    const Descriptor nowhere(open("/dev/null", O_RDONLY | O_CLOEXEC));
    int ends[2];
    if (!nowhere || pipe2(ends, O_CLOEXEC) != 0) throw systemFailure(Msg::childNotStarted, words[0], errno);
    output_.reset(ends[0]);
    const Descriptor writing(ends[1]);
    const pid_t self = getpid();
    pid_ = fork();
    if (pid_ == 0) becomeProgram(arguments.data(), writing.get(), nowhere.get(), handed.get(), self);
    if (pid_ < 0) throw systemFailure(Msg::childNotStarted, words[0], errno);
    setpgid(pid_, pid_);  // whichever of both is first
    handle_.reset(static_cast<int>(syscall(SYS_pidfd_open, pid_, 0)));
    fcntl(output_.get(), F_SETFL, O_NONBLOCK);
}

ChildProcess::~ChildProcess() {
    if (status_ >= 0) return;
    ::kill(pid_, SIGKILL);
    wait();
}

bool ChildProcess::read(std::string& to) {
    for (char block[4096];;) {
        const ssize_t got = ::read(output_.get(), block, sizeof block);
        if (got > 0)
            to.append(block, static_cast<size_t>(got));
        else if (got == 0 || errno != EINTR)
            return got < 0 && errno == EAGAIN;
    }
}

int ChildProcess::wait() {
    int status = 0;
    pid_t ended;
    do ended = waitpid(pid_, &status, 0);
    while (ended < 0 && errno == EINTR);
    status_ = ended < 0 ? 127 : WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
    return status_;
}

bool ChildProcess::endsWithin(int milliseconds) const {
    pollfd end{handle_.get(), POLLIN, 0};
    return handle_ && poll(&end, 1, milliseconds) > 0;
}

// By its handle, as the number may be another process's once it was waited for.
void ChildProcess::signal(int number) const {
    if (handle_) syscall(SYS_pidfd_send_signal, handle_.get(), number, nullptr, 0);
}

void ChildProcess::askToEnd() const {
    signal(SIGTERM);
    signal(SIGCONT);
}

void ChildProcess::kill() const { signal(SIGKILL); }
void ChildProcess::pause() const { signal(SIGTSTP); }
void ChildProcess::resume() const { signal(SIGCONT); }

Bell::Bell() : bell_(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
    if (!bell_) throw systemFailure(Msg::childNotStarted, "eventfd", errno);
}

void Bell::ring() const {
    const eventfd_t one = 1;
    eventfd_write(bell_.get(), one);
}

void Bell::silence() const {
    eventfd_t count;
    eventfd_read(bell_.get(), &count);
}

void waitForAny(std::span<const int> descriptors, int milliseconds) {
    std::vector<pollfd> all;
    for (const int one : descriptors) all.push_back({one, POLLIN, 0});
    poll(all.data(), all.size(), milliseconds);
}

Descriptor fileInMemory() {
    Descriptor file(memfd_create("tarsel", MFD_CLOEXEC));
    if (!file) throw systemFailure(Msg::childNotStarted, "memfd", errno);
    return file;
}

std::string nameOfDescriptor(int descriptor) { return "/proc/self/fd/" + std::to_string(descriptor); }

std::string ownProgram() {
    char name[PATH_MAX];
    const ssize_t length = readlink("/proc/self/exe", name, sizeof name);
    return length > 0 ? std::string(name, static_cast<size_t>(length)) : "/proc/self/exe";
}
