// What the tool needs of a cluster's job scheduler. The programs and options of each scheduler are in its own
// unit.
#pragma once

#include <map>
#include <string>
#include <vector>

// A job array: its elements run the same script, each with its index from 0 to size - 1.
struct ClusterArray {
    std::string name;                // of letters, digits and '-'; unique, the elements are found by it
    std::string script;              // of the shell, run once for each element
    size_t size = 0;                 // elements, at least 1
    int atOnce = 0;                  // elements that may run at the same time; 0: no limit
    std::vector<std::string> after;  // jobs that have to end, with any result, before an element starts
    std::string output;              // absolute name of the file to which all elements append what they print
    std::vector<std::string> options;  // more words for the scheduler, as the user gave them
};

struct ClusterElement {
    std::string array;  // its name
    std::string job;    // its number, for `after` and cancel
    size_t index = 0;
    bool pending = false;  // otherwise it runs, starts or ends
    std::string reason;    // why it is pending, as the scheduler names it
};

class Scheduler {
  public:
    virtual ~Scheduler() = default;
    // Expressions of the shell for the element's index and for the number of processors that it may use.
    virtual std::string indexWord() const = 0;
    virtual std::string coresWord() const = 0;
    // Throws Failure (usage) for options that this tool sets itself or that don't fit an array.
    virtual void checkOptions(const std::vector<std::string>& options) const = 0;
    // Returns the job's number. Throws Failure, with the scheduler's text if it refuses.
    virtual std::string submit(const ClusterArray& array) const = 0;
    // The elements of these arrays, by name, that are pending or running. Throws Failure if the scheduler
    // does not answer.
    virtual std::vector<ClusterElement> elements(const std::vector<std::string>& arrays) const = 0;
    // How elements ended, as the scheduler names it, by name of the array and index. Empty if it keeps no
    // record.
    virtual std::map<std::pair<std::string, size_t>, std::string> ends(
        const std::vector<std::string>& arrays) const = 0;
    // Throws Failure. Jobs that have ended are ignored.
    virtual void cancel(const std::vector<std::string>& jobs) const = 0;
};
