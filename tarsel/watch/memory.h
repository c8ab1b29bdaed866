// What was made of which file, kept in a file so that nothing is done twice after any end of the process.
#pragma once

#include <map>
#include <string>
#include <vector>

#include "tarsel/host/follow/filefacts.h"
#include "tarsel/host/outputs/recordfile.h"

// A file that a run has written, as it left it.
struct MadeFile {
    std::string name;
    long long bytes = 0, modified = 0;  // as in FileFacts
    bool stands() const;                // it is there, and as it was
};

struct WatchedFile {
    enum class State {
        begun,   // the outputs have been begun; those of a target that is not in `made` may be there or not
        done,    // all targets are made; the input has not been put away
        closed,  // the input has been put away, or stays
        failed,  // likewise
    };
    std::string name;    // in the watched folder
    FileFacts facts;     // of the content that was read
    std::string digest;  // of that content
    State state = State::begun;
    std::map<std::string, std::vector<MadeFile>> made;  // what is complete, by the label of its target
    std::vector<std::string> outputs;                   // that have been begun for it, complete or not

    // Whether `now` is the content that was read; it is certain without reading it.
    bool isCertainly(const FileFacts& now) const;
};

// One line of the memory and back. An invalid line gives a record without a name.
std::string lineOf(const WatchedFile& file);
WatchedFile watchedFileOf(const std::string& line);

class WatchMemory {
  public:
    // Throws Failure, also while another process has the file.
    explicit WatchMemory(const std::string& file);

    const WatchedFile* find(const std::string& name) const;
    // On the disk when it returns. Throws Failure; the memory is unchanged then.
    void remember(const WatchedFile& file);
    // The input that an output was begun for, or null.
    const std::string* makerOf(const std::string& output) const;

  private:
    void take(const WatchedFile& file);

    RecordFile lines_;
    std::map<std::string, WatchedFile> files_;
    std::map<std::string, std::string> makers_;  // by output
};
