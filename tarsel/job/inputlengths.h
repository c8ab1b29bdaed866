// Whether the inputs of a job became shorter while it ran. A sound that has become shorter ends as silence,
// so the files themselves are looked at.
#pragma once

#include <memory>
#include <span>
#include <string>
#include <vector>

#include "tarsel/source/source.h"
#include "tarsel/words/failure.h"

// An input became shorter while it was read, so that what was written has too little of it or holds silence
// in its place. The job can be run again with what is left.
class InputShrank : public Failure {
  public:
    InputShrank(const Failure& failure, std::string line) : Failure(failure), warning(std::move(line)) {}
    std::string warning;  // for the attempt that takes what is left
};

class InputLengths {
  public:
    InputLengths() = default;
    // As they are now. `segments`: the files of a join, which is one source.
    InputLengths(std::span<const std::unique_ptr<Source>> sources, std::span<const std::string> segments);

    // Throws InputShrank, or Failure if the job can't be run again: what a device or a pipe has got can't be
    // taken back.
    void check(bool again) const;
    // Throws Failure if an input has another length or time than at first.
    void checkUnchanged() const;

  private:
    struct Row {
        std::string name;
        long long bytes, modified;
    };
    static Row rowOf(const std::string& name);
    std::vector<Row> rows_;  // of inputs that are files
};
