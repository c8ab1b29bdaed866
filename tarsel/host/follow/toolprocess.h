// A run of this tool as a process of its own, so that what a hostile file does to it ends it alone.
#pragma once

#include <mutex>
#include <string>
#include <vector>

#include <sys/types.h>

#include "tarsel/host/descriptor.h"

// It gets SIGTERM when this process ends, however that ends, and no keys or signals of its terminal.
class ToolProcess {
  public:
    ToolProcess() = default;
    ~ToolProcess();  // kills it if it was not waited for
    ToolProcess(const ToolProcess&) = delete;
    ToolProcess& operator=(const ToolProcess&) = delete;

    enum class Stream { output, error };
    // Once, from a thread that outlives it. The other standard streams lead nowhere. Throws Failure.
    void start(const std::vector<std::string>& arguments, Stream captured);
    int descriptor() const { return stream_.get(); }
    bool hasSomething() const;  // to read, which may be the end
    // Adds what there is of the captured stream, waiting for something if there is nothing yet; false at its
    // end.
    bool read(std::string& to);
    // The exit status, or minus the number of the signal that ended it.
    int wait();
    // From any thread; without effect before the start and after the end. A second stop() ends it at once.
    void stop() const;
    void pause() const;
    void resume() const;

  private:
    void signal(int number) const;

    mutable std::mutex lock_;  // of the number, which another process gets once this one was waited for
    pid_t process_ = -1;
    Descriptor stream_;
};
