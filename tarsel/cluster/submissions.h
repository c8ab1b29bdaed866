// The file that records which tasks of a list were submitted to a scheduler: one line for each array. A line
// is written before its array is submitted, so that the queue never has an element that is not recorded.
//
//     {"event":"array", "name":"tarsel-...", "time":..., "tasks":["0123456789ab", ...]}
//
// Element k of the array runs the k-th task.
#pragma once

#include <ctime>
#include <map>
#include <string>
#include <vector>

#include "tarsel/cluster/scheduler.h"
#include "tarsel/host/outputs/recordfile.h"

struct SubmittedArray {
    std::string name;
    std::time_t time = 0;
    std::vector<std::string> tasks;  // by name
};

class Submissions {
  public:
    // Reads the file. A missing one is empty; it is not created.
    explicit Submissions(const std::string& file);

    const std::vector<SubmittedArray>& arrays() const { return arrays_; }
    std::vector<std::string> names() const;
    // Both throw Failure (output), and may be used by one process at a time.
    void add(SubmittedArray array);
    void keep(const std::vector<std::string>& names);  // removes all other arrays

  private:
    std::string file_;
    std::vector<SubmittedArray> arrays_;
};

// Where the tasks of a list are in the scheduler's queue.
struct ClusterQueue {
    struct Place {
        std::string array, job;
        size_t index = 0;
        bool pending = false;
        bool active = false;   // it is pending or running
        std::time_t time = 0;  // when it was submitted
    };
    std::map<std::string, Place> tasks;  // by name: the active place, or else the last one

    ClusterQueue() = default;
    ClusterQueue(const Submissions& submissions, const std::vector<ClusterElement>& elements);
    bool isActive(const std::string& task) const;
    std::vector<std::string> jobs() const;          // that have active elements
    std::vector<std::string> activeArrays() const;  // their names
};
