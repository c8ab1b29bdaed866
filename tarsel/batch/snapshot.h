// The tasks of an array as they are when they are submitted: an element reads its own, and those that make
// its inputs, and not the whole list. The file is a row of documents.
#pragma once

#include <string>
#include <vector>

#include "tarsel/batch/batchfile.h"

class Snapshot {
  public:
    // Of the array's next element: its task and those that make its inputs, as indexes in the list. The word
    // by which readSnapshot finds them, of letters, digits, ':' and ','. Throws Failure.
    std::string add(const QvBatchList& list, size_t task, const std::vector<size_t>& makers);
    // Throws Failure (output).
    void write(const std::string& file) const;

  private:
    std::string text_;
};

struct SnapshotTasks {
    BatchTask task;
    std::vector<BatchTask> makers;  // of its inputs
};

// Throws Failure (usage) for a word of another form, and Failure (input) if the file does not hold what it
// says.
SnapshotTasks readSnapshot(const BatchFile& list, const std::string& file, const std::string& word);
