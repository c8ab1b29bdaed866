// What became of the tasks of a batch, in the form in which it is shown.
#pragma once

#include <ctime>
#include <string>
#include <vector>

enum class TaskEnd {
    done,     // the outputs stand and passed their check
    already,  // an earlier run had done it, and its outputs still stand
    failed,
    stopped,   // by a signal, while it ran
    notRun,    // the run ended before it was due
    disabled,  // switched off in the list
};

struct BatchTaskResult {
    int number = 0;  // place in the list, from 1
    std::string id;  // of the task, 12 hexadecimal digits
    TaskEnd end = TaskEnd::notRun;
    std::vector<std::string> inputs;   // absolute names; generated ones as they are written
    std::string output;                // absolute name that the task has, as "/a/card_%04d.png"; "" for none
    std::vector<std::string> written;  // absolute names of the files; empty unless done or already
    std::time_t start = 0;             // of the last attempt; 0 if there was none
    double seconds = 0;                // of the last attempt, without pauses
    double speed = -1;                 // seconds of output in a second; negative when unknown
    int attempts = 0;                  // in this run
    std::vector<std::string> warnings;
    int status = -1;      // the exit status of the last attempt; 128 + N after signal N; -1 if there was none
    std::string failure;  // one line; "" unless failed
};

struct BatchResult {
    std::string list;  // absolute name of the list's file
    std::time_t start = 0;
    double seconds = 0;                  // of the whole run, without pauses
    int status = 0;                      // with which the run ends: 0, 1, or 129, 130 or 143 after a signal
    std::vector<BatchTaskResult> tasks;  // in the order of the list
};
