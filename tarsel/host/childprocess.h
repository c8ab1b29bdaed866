// Runs of this tool as processes of their own, so that what a hostile file does to one ends it alone. They
// end with this process, whatever ends that.
#pragma once

#include <span>
#include <string>
#include <vector>

#include <sys/types.h>

#include "tarsel/host/descriptor.h"

// In a process group of its own, so that the keys of a terminal don't reach it. It reads nothing; what it
// writes to one of its standard streams comes back here, and the other leads nowhere. The thread that starts
// it has to live as long as it.
class ChildProcess {
  public:
    enum class Stream { output, error };
    static constexpr int kHanded = 3;
    static constexpr int kKilled = -9;  // of wait(): it was ended by force, as where memory is short

    // What all of them get in front of their arguments. Once, before the first.
    static void passOn(std::vector<std::string> arguments);
    static const std::vector<std::string>& passed();
    // `arguments`: those of the tool. `handed`: an open descriptor that becomes its descriptor kHanded, or
    // -1. Throws Failure if there is no room for another process.
    ChildProcess(const std::vector<std::string>& arguments, Stream captured, int handed = -1);
    // Kills it if it has not ended.
    ~ChildProcess();
    ChildProcess(const ChildProcess&) = delete;
    ChildProcess& operator=(const ChildProcess&) = delete;

    // For waitForAny: there is something to read.
    int descriptor() const { return stream_.get(); }
    // Appends what there is without waiting for more. False at the end of it.
    bool read(std::string& to);
    // Waits for its end: the exit status, or minus the number of the signal that ended it.
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
    Descriptor stream_, handle_;
    bool ended_ = false;
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

// A file without a name that is gone when its last descriptor is closed, with this in it. Throws Failure.
Descriptor fileInMemory(const std::string& text = "");
// All that a file holds, from its first byte on.
std::string contentsOf(const Descriptor& file);
// By which it can be opened.
std::string nameOfDescriptor(int descriptor);
