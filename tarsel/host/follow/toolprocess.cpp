#include "tarsel/host/follow/toolprocess.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <filesystem>

#include <fcntl.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "tarsel/words/messages.h"
#include "tarsel/words/systemcause.h"

namespace {

[[noreturn]] void refuse(int error) {
    const SystemCause cause = causeOf(error);
    throw failure(Msg::systemFailed, {cause.why, cause.remedy});
}

// Between fork and exec only calls that a signal's handler may make.
[[noreturn]] void become(const char* program, char** arguments, int captured, int number, pid_t parent) {
    ::setpgid(0, 0);
    ::prctl(PR_SET_PDEATHSIG, SIGTERM);
    if (::getppid() != parent) ::_exit(143);  // which ended before that
    sigset_t none;
    sigemptyset(&none);
    ::sigprocmask(SIG_SETMASK, &none, nullptr);
    for (const int ignored : {SIGPIPE, SIGXFSZ, SIGIO, SIGINT, SIGHUP, SIGTERM}) ::signal(ignored, SIG_DFL);
    const int nowhere = ::open("/dev/null", O_RDWR);
    for (int stream = 0; stream < 3; ++stream) ::dup2(stream == number ? captured : nowhere, stream);
    ::execv(program, arguments);
    ::_exit(127);
}

}  // namespace

void ToolProcess::start(const std::vector<std::string>& arguments, Stream captured) {
    std::error_code error;
    const std::string program = std::filesystem::read_symlink("/proc/self/exe", error).string();
    if (error) refuse(error.value());
    std::vector<std::string> words = {"tarsel"};
    words.insert(words.end(), arguments.begin(), arguments.end());
    std::vector<char*> pointers;
    for (std::string& word : words) pointers.push_back(word.data());
    pointers.push_back(nullptr);
    std::array<int, 2> ends{-1, -1};
    if (::pipe2(ends.data(), O_CLOEXEC) != 0) refuse(errno);
    stream_.reset(ends[0]);
    Descriptor writing(ends[1]);
    const pid_t parent = ::getpid(), process = ::fork();
    if (process < 0) refuse(errno);
    if (process == 0)
        become(program.c_str(), pointers.data(), ends[1], captured == Stream::output ? 1 : 2, parent);
    const std::lock_guard guard(lock_);
    process_ = process;
}

ToolProcess::~ToolProcess() {
    signal(SIGKILL);
    wait();
}

bool ToolProcess::hasSomething() const {
    pollfd stream{stream_.get(), POLLIN, 0};
    return ::poll(&stream, 1, 0) > 0;
}

bool ToolProcess::read(std::string& to) {
    std::array<char, 65536> block{};
    for (;;) {
        const ssize_t got = ::read(stream_.get(), block.data(), block.size());
        if (got < 0 && errno == EINTR) continue;
        if (got > 0) to.append(block.data(), static_cast<size_t>(got));
        return got > 0;
    }
}

int ToolProcess::wait() {
    const pid_t process = process_;
    if (process < 0) return -1;
    siginfo_t info{};
    while (::waitid(P_PID, static_cast<id_t>(process), &info, WEXITED | WNOWAIT) != 0 && errno == EINTR) {
    }
    const std::lock_guard guard(lock_);
    process_ = -1;
    ::waitpid(process, nullptr, 0);
    return info.si_code == CLD_EXITED ? info.si_status : -info.si_status;
}

void ToolProcess::signal(int number) const {
    const std::lock_guard guard(lock_);
    if (process_ > 0) ::kill(process_, number);
}

void ToolProcess::stop() const { signal(SIGTERM); }
void ToolProcess::pause() const { signal(SIGTSTP); }
void ToolProcess::resume() const { signal(SIGCONT); }
