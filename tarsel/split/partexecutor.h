// Who carries out the parts of a divided job: processes of this machine, or a scheduler. A part is a task
// file with absolute names, and what carries it out is "tarsel run FILE": it is done when its output stands.
#pragma once

#include <string>
#include <vector>

struct Part {
    std::string task;   // its file
    double weight = 1;  // of its share of the whole
};

struct PartState {
    bool ended = false;
    double done = 0;                    // 0 to 1
    long long frames = 0;               // written so far
    std::vector<std::string> warnings;  // that it has given
    std::vector<std::string> outputs;   // of one that ended well
    int status = 0;                     // with which it ended; that of a killed one is Exit::failed
    std::string failure;                // why it did not end well; "" for those that end with a failed one
};

class PartExecutor {
  public:
    virtual ~PartExecutor() = default;
    // Once. Throws Failure if none can begin.
    virtual void begin(const std::vector<Part>& parts) = 0;
    // Waits a moment for news. False when nothing is at work any more: all have ended, or one has failed or
    // all were cancelled, and the others were ended.
    virtual bool wait() = 0;
    virtual const std::vector<PartState>& states() const = 0;
    // From any thread.
    virtual void cancel() = 0;
    virtual void pause(bool paused) = 0;
};
