// What a list's task is to the tool: a name that stays, what it reads and writes, and what it is stored as.
#pragma once

#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

struct BatchTask {
    int number = 0;  // place in the list, from 1
    // The first 12 of 32 hexadecimal digits of a digest of the stored task. Whether it is enabled and where
    // it stands in the list do not count.
    std::string id;
    bool enabled = true;
    std::vector<std::string> inputs;  // absolute, without generated ones
    std::string output;               // absolute; "" for none
    bool soundApart = false;          // the output has pictures, and its sound is a WAV file next to them
    // A task that could not be planned when it was added, because an earlier one makes its input: the words
    // of its command line, and the folder in which they were given.
    std::vector<std::string> words;
    std::string folder;
    AnyDict state;      // with absolute names
    std::string fault;  // why it can't be used; "" for a task that looks sound

    bool isPlanned() const { return words.empty(); }
};

// `folder`: that relative names count from. Never throws for what the task holds.
BatchTask batchTask(const AnyDict& stored, int number, const std::string& folder);

// Only its number, output and whether it is enabled, in a fraction of the time.
BatchTask outputOf(const AnyDict& stored, int number, const std::string& folder);

// A task that is planned when it runs, as it is stored.
AnyDict plannedLater(const std::vector<std::string>& words, const std::string& folder,
                     const std::vector<std::string>& inputs, const std::string& output);

// The task and the size and time of each input, as 32 hexadecimal digits: what was done is known by it.
std::string keyOf(const BatchTask& task);

// Whether one of the files that `name` stands for, or that are written next to it ("card#0001.png" and
// "card.wav" for "card.png"), may be `file`.
bool mayWrite(const std::string& name, const std::string& file);
