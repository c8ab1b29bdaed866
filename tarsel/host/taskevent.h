// The object that --progress json has for each task of a batch.
#pragma once

#include <string>
#include <vector>

#include "tarsel/host/events.h"

struct TaskEvent {
    int number = 0, count = 0;  // place in the list, from 1, and how many the list has
    std::string id;             // of the task, 12 hexadecimal digits
    int attempt = 0;            // from 1; 0 for one that did not run
    JobFigures figures;         // `state`: running or paused; at its end done, already, failed or stopped
    // At its end, else `status` is negative.
    int status = -1;
    std::string failure;               // one line; "" unless it failed
    std::vector<std::string> outputs;  // absolute names of the files
};

// Sends "task". One that says that a task is at work is left out while the reader has no room.
void tellTask(const TaskEvent& task);
