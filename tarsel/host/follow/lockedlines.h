// A file of lines that one process adds to and that has to be right after any end of it.
#pragma once

#include <string>
#include <vector>

#include "tarsel/host/descriptor.h"

// Each line has a checksum in front. A line that is torn or damaged is passed over.
class LockedLines {
  public:
    // Makes the file if it is missing. Throws Failure (output), also while another process has it.
    explicit LockedLines(const std::string& name);

    // Throws Failure (input).
    std::vector<std::string> lines() const;
    // On the disk when it returns. `line` has no line break. Throws Failure (output); nothing was added then.
    void add(const std::string& line);
    // The same with all lines at once: either the old ones or the new ones are there after any end.
    void replace(const std::vector<std::string>& lines);
    const std::string& name() const { return name_; }

  private:
    void open();

    std::string name_;
    Descriptor file_;
};
