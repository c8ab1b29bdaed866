// What a scheduler of a cluster is asked. Its programs, options and texts are in the unit of the scheduler.
#pragma once

#include <map>
#include <string>
#include <vector>

// Elements that differ in a number from 0 on.
struct ClusterArray {
    std::string name;                  // by which its elements are known: letters, digits, '-'
    std::string script;                // of the shell, run once for each element
    size_t size = 0;                   // elements, at least 1
    int atOnce = 0;                    // so many run at a time; 0 for no limit
    std::vector<std::string> after;    // jobs that have to end, well or not, before an element begins
    std::string output;                // absolute name of the file to which all append what they print
    std::vector<std::string> options;  // more words for the scheduler, as the user gave them
};

struct ClusterElement {
    std::string array;  // its name
    std::string job;    // as `after` and cancel take it
    size_t index = 0;
    bool waits = false;  // otherwise it runs, begins or ends
    std::string reason;  // why it waits, in the scheduler's word
};

class Scheduler {
  public:
    virtual ~Scheduler() = default;
    // The words of the shell for the number of the element and for the processors that it may use.
    virtual std::string indexWord() const = 0;
    virtual std::string coresWord() const = 0;
    // Throws Failure (usage) for words that would contradict what this tool says itself.
    virtual void checkOptions(const std::vector<std::string>& options) const = 0;
    // The job. Throws Failure, with the scheduler's text when it refuses.
    virtual std::string submit(const ClusterArray& array) const = 0;
    // Those of these arrays that wait or run. Throws Failure if the scheduler does not answer.
    virtual std::vector<ClusterElement> elements(const std::vector<std::string>& arrays) const = 0;
    // How elements ended, in the scheduler's word, by array and number. Empty where nothing is kept.
    virtual std::map<std::pair<std::string, size_t>, std::string> ends(
        const std::vector<std::string>& arrays) const = 0;
    // Throws Failure. A job that has ended is no error.
    virtual void cancel(const std::vector<std::string>& jobs) const = 0;
};
