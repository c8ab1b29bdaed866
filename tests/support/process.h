// Programs run as a user runs them: arguments, standard streams, signals, a terminal.
#pragma once

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <string>
#include <vector>

#include <fcntl.h>
#include <poll.h>
#include <pty.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

struct ProcessOptions {
    std::string folder;                    // to run in
    std::vector<std::string> environment;  // "NAME=value", added
    std::string outputTo;                  // the standard output is this file instead of being captured
    long long fileLimit = 0;               // bytes that a file may grow to; 0: no limit
    bool terminal = false;                 // all three streams are a terminal of their own, captured in `out`
    bool ignoreHangup = false;             // as under nohup
};

struct Outcome {
    int status = -1;  // the exit status; 128 + the signal that ended it; -1 when it had to be killed
    std::string out, err;
};

// A running program. What it writes is gathered while one of the waiting operations runs.
class Process {
  public:
    static constexpr int kPatience = 60000;  // ms after which a wait gives up

    explicit Process(const std::vector<std::string>& words, const ProcessOptions& options = {}) {
        int out[2] = {-1, -1}, err[2] = {-1, -1};
        if (!options.terminal && (pipe2(out, O_CLOEXEC) != 0 || pipe2(err, O_CLOEXEC) != 0)) std::abort();
        int master = -1;
        pid_ = options.terminal ? forkpty(&master, nullptr, nullptr, nullptr) : fork();
        if (pid_ == 0) becomeProgram(words, options, out[1], err[1]);
        if (options.terminal) {
            streams_[0] = {master, POLLIN, 0};
        } else {
            close(out[1]);
            close(err[1]);
            streams_[0] = {out[0], POLLIN, 0};
            streams_[1] = {err[0], POLLIN, 0};
        }
        streams_[2] = {static_cast<int>(syscall(SYS_pidfd_open, pid_, 0)), POLLIN, 0};
    }
    ~Process() {
        if (!ended_) {
            kill(pid_, SIGKILL);
            waitpid(pid_, nullptr, 0);
        }
        for (const pollfd& stream : streams_)
            if (stream.fd >= 0) close(stream.fd);
    }
    Process(const Process&) = delete;
    Process& operator=(const Process&) = delete;

    void signal(int number) const { kill(pid_, number); }
    pid_t id() const { return pid_; }
    void type(const std::string& keys) const {
        if (write(streams_[0].fd, keys.data(), keys.size()) < 0) std::abort();
    }

    // Waits until `text` was written to either stream from now on; false if it ends or takes too long.
    bool waitFor(const std::string& text) {
        const std::array<size_t, 2> from = {seen_[0], seen_[1]};
        for (;;) {
            for (size_t i = 0; i < 2; ++i)
                if (const size_t at = text_[i].find(text, from[i]); at != std::string::npos) {
                    seen_[i] = at + text.size();
                    return true;
                }
            if (!gather()) return false;
        }
    }

    Outcome finish() {
        while (gather()) {
        }
        Outcome outcome;
        int status = 0;
        // What is left to read when its process has ended, and no more: a child of it may hold the streams.
        if (!(streams_[2].revents & POLLIN)) kill(pid_, SIGKILL);
        waitpid(pid_, &status, 0);
        const bool killed = !(streams_[2].revents & POLLIN);
        ended_ = true;
        outcome.status = killed ? -1 : WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
        outcome.out = text_[0];
        outcome.err = text_[1];
        return outcome;
    }

  private:
    [[noreturn]] static void becomeProgram(const std::vector<std::string>& words,
                                           const ProcessOptions& options, int out, int err) {
        if (!options.terminal) {
            dup2(open("/dev/null", O_RDONLY), 0);
            dup2(options.outputTo.empty() ? out : open(options.outputTo.c_str(), O_WRONLY), 1);
            dup2(err, 2);
        }
        if (!options.folder.empty() && chdir(options.folder.c_str()) != 0) _exit(126);
        for (const auto& variable : options.environment) putenv(const_cast<char*>(variable.c_str()));
        if (options.fileLimit > 0) {
            const rlimit limit{static_cast<rlim_t>(options.fileLimit),
                               static_cast<rlim_t>(options.fileLimit)};
            setrlimit(RLIMIT_FSIZE, &limit);
        }
        std::signal(SIGHUP, options.ignoreHangup ? SIG_IGN : SIG_DFL);
        std::signal(SIGINT, SIG_DFL);  // a shell's background ignores it
        std::vector<char*> arguments;
        for (const auto& word : words) arguments.push_back(const_cast<char*>(word.c_str()));
        arguments.push_back(nullptr);
        execvp(arguments[0], arguments.data());
        _exit(127);
    }

    // Takes what there is, waiting for something to happen. False when the process has ended and nothing is
    // left, or when patience is.
    bool gather() {
        if (poll(streams_.data(), streams_.size(), kPatience) <= 0) return false;
        bool any = false;
        for (size_t i = 0; i < 2; ++i) {
            if (streams_[i].fd < 0 || !(streams_[i].revents & (POLLIN | POLLHUP | POLLERR))) continue;
            char block[65536];
            const ssize_t got = read(streams_[i].fd, block, sizeof block);
            if (got > 0) {
                text_[i].append(block, static_cast<size_t>(got));
                any = true;
            } else if (got == 0 || errno != EINTR) {
                close(streams_[i].fd);
                streams_[i].fd = -1;
            }
        }
        return any || !(streams_[2].revents & POLLIN);
    }

    pid_t pid_ = -1;
    bool ended_ = false;
    std::array<pollfd, 3> streams_ = {{{-1, 0, 0}, {-1, 0, 0}, {-1, 0, 0}}};
    std::array<std::string, 2> text_;
    std::array<size_t, 2> seen_ = {0, 0};
};

inline Outcome runProgram(const std::vector<std::string>& words, const ProcessOptions& options = {}) {
    return Process(words, options).finish();
}
