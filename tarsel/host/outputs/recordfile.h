// A file of lines to which one process at a time appends. Each line carries a checksum, so that one that was
// cut by a crash, or damaged, is passed over.
//
//     a3f0c2d4e5f60718 {"event":"done"}
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "tarsel/host/descriptor.h"

class RecordFile {
  public:
    // Opens the file, which is made if it is missing, as is its folder. Throws Failure (output).
    explicit RecordFile(const std::string& name);

    // Keeps other processes from it as long as this lives. tryLock is false if another one has it; lock waits
    // until that one has ended.
    bool tryLock();
    void lock();
    // With `sync` the line, and all before it, is on the disk when this returns. Throws Failure (output).
    void append(std::string_view text, bool sync);

    // Whether another process has the lock of a file.
    static bool isLocked(const std::string& name);
    // The whole lines of a file; none if it does not exist.
    static std::vector<std::string> read(const std::string& name);

  private:
    std::string name_;
    Descriptor file_;
    bool entered_ = false;  // its name is on the disk
};

// A lock that names the process that has it.
class NamedLock {
  public:
    // Throws Failure (output) if the file can't be made, and Failure with the message `held` (a file, then
    // the host and the number of the process) if a living process has it. One that is ending is waited for.
    NamedLock(const std::string& name, const std::string& shown);

  private:
    Descriptor file_;
};
