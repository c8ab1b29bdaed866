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
    // Opens the file, which is made if it is missing, as is its folder. Throws Failure (output), also for
    // what is no regular file.
    explicit RecordFile(const std::string& name);

    // Keeps other processes from it as long as this lives. tryLock is false if another one has it; lock waits
    // until that one has ended.
    bool tryLock();
    void lock();
    // With `sync` the line, and all before it, is on the disk when this returns. `text` has no line break.
    // Throws Failure (output); nothing was added then.
    void append(std::string_view text, bool sync);
    // All lines by others at once: after any end either the old ones or the new ones are there. The lock is
    // that of the new file. Throws Failure (output).
    void replace(const std::vector<std::string>& lines);
    // The whole lines. Throws Failure (input).
    std::vector<std::string> lines() const;

    // Whether another process has the lock of a file.
    static bool isLocked(const std::string& name);
    // The whole lines of a file; none if it does not exist or can't be read.
    static std::vector<std::string> read(const std::string& name);

  private:
    void openFile();

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
