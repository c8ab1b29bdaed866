// Which tasks of a list were given to a scheduler: a line for each array, written before the array is
// submitted, so that no element is ever in the queue that is not known here.
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
    std::vector<std::string> tasks;  // their names
};

class Submissions {
  public:
    // Does not make the file.
    explicit Submissions(const std::string& file);

    const std::vector<SubmittedArray>& arrays() const { return arrays_; }
    std::vector<std::string> names() const;
    // Each throws Failure (output). One process at a time.
    void add(SubmittedArray array);
    void keep(const std::vector<std::string>& names);  // and forget the others

  private:
    std::string file_;
    std::vector<SubmittedArray> arrays_;
};

// What the scheduler has of a list, by the names of tasks.
struct ClusterQueue {
    struct Place {
        std::string array, job;
        size_t index = 0;
        bool waits = false, lives = false;  // `lives`: it waits or runs
        std::time_t time = 0;               // when it was submitted
    };
    std::map<std::string, Place> tasks;  // the last place of each

    ClusterQueue() = default;
    ClusterQueue(const Submissions& submissions, const std::vector<ClusterElement>& elements);
    bool lives(const std::string& task) const;
    std::vector<std::string> jobs() const;          // that have living elements
    std::vector<std::string> livingArrays() const;  // their names
};
