// What runs the parts of a divided job: processes of this machine, or a cluster's scheduler. Each part is a
// task file with absolute names, which "tarsel run FILE" carries out.
#pragma once

#include <string>
#include <vector>

struct Part {
    std::string task;   // name of the file
    double weight = 1;  // its share of the work, relative to the other parts
};

struct PartState {
    bool ended = false;
    double done = 0;                    // 0 to 1
    long long frames = 0;               // written so far
    std::vector<std::string> warnings;  // so far
    std::vector<std::string> outputs;   // files that it wrote, if it succeeded
    int status = 0;                     // exit status; Exit::failed for a process that was killed
    // Why it failed; "" if it succeeded, or was stopped because another part failed.
    std::string failure;
};

class PartExecutor {
  public:
    virtual ~PartExecutor() = default;
    // To be called once. Throws Failure if no part can start.
    virtual void begin(const std::vector<Part>& parts) = 0;
    // Waits a moment and updates states(). False once nothing runs any more: all parts have ended. After a
    // failure or cancel() the parts that still run are stopped, and others don't start.
    virtual bool wait() = 0;
    virtual const std::vector<PartState>& states() const = 0;
    // These from any thread.
    virtual void cancel() = 0;
    virtual void pause(bool paused) = 0;

  protected:
    // Records a part that failed, number `part` from 0. `status`: its exit status, and `signal` the one that
    // killed it, or 0. `reported`: the reason that it gave; "" for none. `output`: of the whole job, for the
    // message.
    static void setFailure(PartState& state, const std::string& output, size_t part, int status, int signal,
                           const std::string& reported);
};
