// What was done with a task. Its file has a line for each step:
//
//     {"event":"started", "key":..., "time":..., "host":..., "pid":...}
//     {"event":"placing", "key":..., "files":[{"name":..., "bytes":..., "changed":..., "digest":...}]}
//     {"event":"done", "key":..., "seconds":..., "files":[...]}
//     {"event":"failed", "key":..., "status":..., "error":...}
//
// "placing" is on the disk before the first file gets its name, "done" is written after the last one has it.
// Other lines may be lost when the power fails: then the task is done again, or its files tell.
// After an end between the two, the files say whether the task was done.
#pragma once

#include <ctime>
#include <string>
#include <vector>

#include "tarsel/host/filestamp.h"
#include "tarsel/host/outputs/outputs.h"
#include "tarsel/host/outputs/recordfile.h"

struct RecordedFile {
    std::string name;  // absolute
    FileStamp stamp;
    std::string digest;
};

struct TaskRecord {
    enum class Step { none, started, placing, done, failed };
    Step last = Step::none;
    std::string key;  // see keyOf
    std::vector<RecordedFile> files;
    std::time_t start = 0;
    std::string host;
    long long pid = 0;
    double seconds = 0;
    int status = 0;
    std::string failure;

    // The last step that is whole in the file. A file that is missing is one without steps.
    static TaskRecord read(const std::string& file);

    // Whether all files have the recorded size and time, and with `digests` the recorded bytes.
    bool stands(bool digests) const;
    // Whether nothing is left to do for the task of this key.
    bool isDone(const std::string& wanted, bool digests) const {
        return last == Step::done && key == wanted && stands(digests);
    }
};

// The journal of the one task that this process runs.
class TaskJournal {
  public:
    // Throws Failure (output). tryLock and lock: see RecordFile; nothing is written without it.
    TaskJournal(const std::string& file, std::string key);
    bool tryLock() { return file_.tryLock(); }
    void lock() { file_.lock(); }

    // Each throws Failure (output).
    void started();
    void placing(const std::vector<PlacedFile>& files);
    void done();
    void failed(int status, const std::string& error);
    // That an earlier run had placed these files and did not come to say so.
    void settled(const std::vector<RecordedFile>& files);

  private:
    RecordFile file_;
    std::string key_;
    std::vector<RecordedFile> placed_;
    double start_ = 0;  // of the system's counter
};
