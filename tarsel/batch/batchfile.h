// A list of tasks as a file, and the names of what is next to it.
//
//     night.xml              the list
//     night.xml.lock         locked while a run of the tool changes the list
//     night.xml.journal.d/   what was done: a file for each task, the lock of the run, and for batches on a
//                            cluster "queue", and for each array its tasks and what its
//                            elements print
#pragma once

#include <functional>
#include <string>
#include <vector>

#include "tarsel/batch/batchtask.h"
#include "tarsel/host/descriptor.h"

class BatchFile {
  public:
    // `name`: as the user gave it. Symbolic links are followed, so that a list has one journal.
    explicit BatchFile(const std::string& name);

    const std::string& shown() const { return shown_; }  // as the user gave it
    const std::string& name() const { return name_; }    // absolute
    std::string folder() const;                          // that relative names in the list count from
    std::string runLock() const { return journalFolder() + "run"; }
    std::string queue() const { return journalFolder() + "queue"; }  // what a scheduler was given
    // To which the elements of an array of this name print, and their tasks; see snapshot.h.
    std::string elementOutput(const std::string& array) const { return journalFolder() + array + ".txt"; }
    std::string elementTasks(const std::string& array) const { return journalFolder() + array + ".xml"; }
    std::string journal(const std::string& id) const { return journalFolder() + id; }

    // Throws Failure (input) for a file that can't be read or is no list.
    QvBatchList load() const;
    // Its tasks, without their states.
    std::vector<BatchTask> tasks() const { return tasksOf(load()); }
    std::vector<BatchTask> tasksOf(const QvBatchList& list) const;
    // Some tasks of the list as a document of its own, for a process that need not read the whole list; and
    // these tasks there, with the numbers that they have in the list. Both throw Failure.
    static Descriptor handOver(const QvBatchList& list, const std::vector<size_t>& indexes);
    std::vector<BatchTask> handedTasks(int descriptor, const std::vector<int>& numbers) const;
    // Makes an empty list. Throws Failure (output) if the file exists, unless `overwrite`.
    void make(bool overwrite) const;
    // Loads the list, changes it and puts it in the place of the old one, while no other run can. The file
    // is unchanged if `change` throws.
    void change(const std::function<void(QvBatchList& list)>& change) const;

  private:
    std::string journalFolder() const { return name_ + ".journal.d/"; }

    std::string shown_, name_;
};

// Whether a word is the number of a task, be there such a task or not.
bool isTaskNumber(const std::string& word);
// The index in `tasks` of the task that a word names: its number, or the first digits of its name. Throws
// Failure (usage).
size_t findTask(const std::vector<BatchTask>& tasks, const std::string& word, const BatchFile& file);
