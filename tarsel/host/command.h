// What this program starts and waits for: commands of the shell, to which it passes signals on, and other
// programs, which it asks.
#pragma once

#include <mutex>
#include <string>
#include <vector>

#include <sys/types.h>

// In a process group of its own, so that a signal reaches all that the shell has started, and reads nothing
// from this program's standard input.
class ShellCommand {
  public:
    ShellCommand() = default;
    ~ShellCommand();
    ShellCommand(const ShellCommand&) = delete;
    ShellCommand& operator=(const ShellCommand&) = delete;

    // Once. One that can't be started ends with -1.
    void start(const std::string& command);
    // Its exit code, 128 plus the number of the signal that ended it, or -1 if its end can't be learned.
    int wait();
    // From any thread, as long as this object lives; while it starts, once it has started, and before that
    // without effect.
    void signal(int number) const;
    void kill() const;

  private:
    mutable std::mutex lock_;  // of its start
    pid_t group_ = -1;
    bool ended_ = false;
};

struct Answer {
    int status = 0;  // the exit status, or 128 + N after signal N
    std::string out, err;
};

// `words`: the program, which is looked for in PATH, and its arguments. `input`: all that it reads. Variables
// of the environment whose names begin with one of `without` are kept from it. In a process group of its own,
// so that the keys of a terminal don't reach it; one that takes longer than so many seconds is killed. Throws
// Failure (module) if there is no such program, and Failure (failed) if it can't be started or takes too
// long.
Answer askProgram(const std::vector<std::string>& words, const std::string& input, double seconds,
                  const std::vector<std::string>& without = {});

// The file of this process's own program.
std::string ownProgram();
