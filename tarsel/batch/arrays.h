// The tasks of a list as arrays for a scheduler: what waits for another task is in a later array.
#pragma once

#include <set>
#include <string>
#include <vector>

#include "tarsel/batch/order.h"

struct TaskArray {
    std::vector<size_t> tasks;   // indexes in the list
    std::set<size_t> after;      // earlier arrays that have to end first
    std::set<std::string> jobs;  // the same of the scheduler's, submitted before
};

// Of a task, as far as arrays are concerned.
struct TaskPlace {
    bool due = false;  // it is to be in an array
    std::string job;   // that it is in already; "" for none
};

// In the order in which they can be submitted, each with up to `most` tasks. `places` and `order` have an
// entry for each task of the list.
std::vector<TaskArray> arraysOf(const std::vector<TaskPlace>& places,
                                const std::vector<std::vector<Before>>& order, size_t most);

// What an element of an array does, as a script of the shell.
struct ElementScript {
    std::vector<std::string> tasks;   // names; element k runs the k-th
    std::vector<std::string> places;  // of the tasks in the snapshot; see Snapshot::add
    std::string snapshot;             // absolute name of the file
    // The tool and its arguments, to which those are added that the element or the task decides.
    std::vector<std::string> words;
    std::string log;           // absolute; the task's name is added to it; "" for none
    std::string index, cores;  // of the element, as the shell has them; see Scheduler
    int mostCores = 1;

    // No character in a word acts in the shell, whatever it is.
    std::string text() const;
};
