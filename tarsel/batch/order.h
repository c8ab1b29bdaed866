// Which files tasks share: outputs that collide, and what has to wait for what.
#pragma once

#include <map>
#include <string>
#include <unordered_map>
#include <vector>

#include "tarsel/batch/batchtask.h"

// Names of files in a form by which places can be compared: links of their folders are followed.
class Places {
  public:
    std::string of(const std::string& name);
    // All names under which a task writes. Pictures that are numbered count as the name that they have in
    // common.
    std::vector<std::string> writtenBy(const BatchTask& task);

  private:
    std::unordered_map<std::string, std::string> folders_;
};

// Outputs of tasks, and which of them may be a file.
class OutputIndex {
  public:
    void add(size_t task, const std::string& place);
    std::vector<size_t> writersOf(const std::string& place) const;

  private:
    struct Output {
        size_t task;
        std::string place;
    };
    std::unordered_multimap<std::string, Output> byStem_, numbered_;  // by folder and stem; by folder
};

struct Before {
    size_t task;  // index of an earlier one
    bool gives;   // it makes an input; otherwise it reads what the later one writes
};

// For each task the earlier ones that have to end before it begins. Disabled ones don't count.
std::vector<std::vector<Before>> orderOf(const std::vector<BatchTask>& tasks);
