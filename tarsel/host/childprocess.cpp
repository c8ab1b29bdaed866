#include "tarsel/host/childprocess.h"

#include <cerrno>
#include <csignal>
#include <utility>

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/mman.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>

#include "tarsel/words/messages.h"

namespace {

// By this name it is the file of this process even when another one has taken its place, as in an upgrade.
constexpr const char* kOwnProgram = "/proc/self/exe";

static_assert(ChildProcess::kKilled == -SIGKILL);

// What the child gets in the place of what this process has.
struct Inherited {
    int captured, stream, handed, nowhere;
    pid_t parent;
};

bool giveHanded(int handed) {
    if (handed < 0) return true;
    return handed == ChildProcess::kHanded ? fcntl(handed, F_SETFD, 0) == 0
                                           : dup2(handed, ChildProcess::kHanded) >= 0;
}

// Between fork and exec nothing but calls that need no lock and no memory.
[[noreturn]] void becomeTool(char* const* words, const Inherited& own) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (getppid() != own.parent) _exit(127);  // it has ended before that was set
    setpgid(0, 0);
    for (const int ignored : {SIGPIPE, SIGXFSZ, SIGIO, SIGTERM}) ::signal(ignored, SIG_DFL);
    sigset_t none;
    sigemptyset(&none);
    pthread_sigmask(SIG_SETMASK, &none, nullptr);
    for (int stream = 0; stream <= STDERR_FILENO; ++stream)
        if (dup2(stream == own.stream ? own.captured : own.nowhere, stream) < 0) _exit(127);
    if (!giveHanded(own.handed)) _exit(127);
    execv(kOwnProgram, words);
    _exit(127);
}

int waitFor(pid_t process) {
    int status = 0;
    pid_t ended;
    do ended = waitpid(process, &status, 0);
    while (ended < 0 && errno == EINTR);
    return ended < 0 ? 127 : WIFSIGNALED(status) ? -WTERMSIG(status) : WEXITSTATUS(status);
}

std::vector<std::string>& passedOn() {
    static std::vector<std::string> arguments;
    return arguments;
}

[[noreturn]] void refuse(int error) { throw systemFailure(Msg::childNotStarted, "tarsel", error); }

}  // namespace

void ChildProcess::passOn(std::vector<std::string> arguments) { passedOn() = std::move(arguments); }
const std::vector<std::string>& ChildProcess::passed() { return passedOn(); }

ChildProcess::ChildProcess(const std::vector<std::string>& arguments, Stream captured, int handed) {
    std::vector<char*> words = {const_cast<char*>("tarsel")};
    for (const auto* some : {&std::as_const(passedOn()), &arguments})
        for (const std::string& one : *some) words.push_back(const_cast<char*>(one.c_str()));
    words.push_back(nullptr);
    const Descriptor nowhere(open("/dev/null", O_RDWR | O_CLOEXEC));
    int ends[2];
    if (!nowhere || pipe2(ends, O_CLOEXEC) != 0) refuse(errno);
    stream_.reset(ends[0]);
    const Descriptor writing(ends[1]);
    const int stream = captured == Stream::output ? STDOUT_FILENO : STDERR_FILENO;
    const Inherited own{writing.get(), stream, handed, nowhere.get(), getpid()};
    pid_ = fork();
    if (pid_ == 0) becomeTool(words.data(), own);
    if (pid_ < 0) refuse(errno);
    setpgid(pid_, pid_);  // whichever of both is first
    handle_.reset(static_cast<int>(syscall(SYS_pidfd_open, pid_, 0)));
    if (!handle_) {
        const int error = errno;
        ::kill(pid_, SIGKILL);
        waitFor(pid_);
        refuse(error);
    }
    fcntl(stream_.get(), F_SETFL, O_NONBLOCK);
}

ChildProcess::~ChildProcess() {
    if (ended_) return;
    kill();
    wait();
}

bool ChildProcess::read(std::string& to) {
    for (char block[16384];;) {
        const ssize_t got = ::read(stream_.get(), block, sizeof block);
        if (got > 0)
            to.append(block, static_cast<size_t>(got));
        else if (got == 0 || errno != EINTR)
            return got < 0 && errno == EAGAIN;
    }
}

int ChildProcess::wait() {
    ended_ = true;
    return waitFor(pid_);
}

bool ChildProcess::endsWithin(int milliseconds) const {
    pollfd end{handle_.get(), POLLIN, 0};
    return poll(&end, 1, milliseconds) > 0;
}

// By its handle, as the number may be another process's once it was waited for.
void ChildProcess::signal(int number) const {
    syscall(SYS_pidfd_send_signal, handle_.get(), number, nullptr, 0);
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

Descriptor fileInMemory(const std::string& text) {
    Descriptor file(memfd_create("tarsel", MFD_CLOEXEC));
    if (!file) throw systemFailure(Msg::childNotStarted, "memfd", errno);
    for (size_t at = 0; at < text.size();) {
        const ssize_t written =
            pwrite(file.get(), text.data() + at, text.size() - at, static_cast<off_t>(at));
        if (written < 0 && errno == EINTR) continue;
        if (written <= 0) throw systemFailure(Msg::childNotStarted, "memfd", errno);
        at += static_cast<size_t>(written);
    }
    return file;
}

std::string contentsOf(const Descriptor& file) {
    std::string text;
    for (char block[65536];;) {
        const ssize_t got = pread(file.get(), block, sizeof block, static_cast<off_t>(text.size()));
        if (got > 0)
            text.append(block, static_cast<size_t>(got));
        else if (got == 0 || errno != EINTR)
            return text;
    }
}

std::string nameOfDescriptor(int descriptor) { return "/proc/self/fd/" + std::to_string(descriptor); }
