// A command of the shell that this program starts, waits for, and passes signals on to.
#pragma once

#include <string>

#include <sys/types.h>

// In a process group of its own, so that a signal reaches all that the shell has started, and reads nothing
// from this program's standard input.
class ShellCommand {
  public:
    // Starts it. One that can't be started ends with -1.
    explicit ShellCommand(const std::string& command);
    ~ShellCommand();
    ShellCommand(const ShellCommand&) = delete;
    ShellCommand& operator=(const ShellCommand&) = delete;

    // Its exit code, 128 plus the number of the signal that ended it, or -1 if its end can't be learned.
    int wait();
    // From any thread, as long as it lives.
    void signal(int number) const;
    void kill() const;

  private:
    pid_t group_ = -1;
    bool ended_ = false;
};
