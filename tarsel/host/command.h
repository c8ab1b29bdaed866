// A command of the shell that this program starts, waits for, and passes signals on to.
#pragma once

#include <mutex>
#include <string>

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
