// A program that this one starts and that ends with it, whatever ends it.
#pragma once

#include <chrono>
#include <span>
#include <string>
#include <vector>

#include <sys/types.h>

#include "tarsel/host/descriptor.h"

// In a process group of its own, so that the keys of a terminal don't reach it. It reads
// nothing, and all that it writes to its standard streams comes back here. The thread that starts it has to
// live as long as it.
class ChildProcess {
  public:
    static constexpr int kHanded = 3;

    // words[0] is the file to run. `handed` becomes its descriptor kHanded. Throws Failure if there is no
    // room for another process.
    ChildProcess(const std::vector<std::string>& words, const Descriptor& handed);
    // Kills it if it has not ended.
    ~ChildProcess();
    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    // For waitForAny: there is something to read.
    int descriptor() const { return output_.get(); }
    // Appends what there is without waiting for more. False at the end of it.
    bool read(std::string& to);
    // Waits for its end: the exit status, or 128 plus the number of the signal that ended it.
    int wait();
    // Whether it has ended after so many milliseconds at most. From any thread.
    bool endsWithin(int milliseconds) const;
    // These from any thread, without effect once it has ended.
    void askToEnd() const;  // SIGTERM, which one that is paused sees as well
    void kill() const;
    void pause() const;
    void resume() const;

  private:
    void signal(int number) const;

    pid_t pid_ = -1;
    Descriptor output_, handle_;
    int status_ = -1;
};

// Wakes a thread that is in waitForAny.
class Bell {
  public:
    Bell();
    void ring() const;  // from any thread
    void silence() const;
    int descriptor() const { return bell_.get(); }

  private:
    Descriptor bell_;
};

// Until one of them can be read, or so many milliseconds have passed; negative: without an end.
void waitForAny(std::span<const int> descriptors, int milliseconds);

// A file without a name that is gone when its last descriptor is closed. Throws Failure.
Descriptor fileInMemory();
// By which it can be opened.
std::string nameOfDescriptor(int descriptor);

// The program that is running, as a file.
std::string ownProgram();
