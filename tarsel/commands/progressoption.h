// --progress of the commands that may work for long.
#pragma once

#include <span>
#include <string>
#include <vector>

#include "tarsel/job/progress.h"

class Command;

struct ProgressOption {
    std::string text = "auto";  // as it was given
    ProgressMode mode;

    void add(Command& command);
    // Before the engine starts, so that what is said of plug-ins is an object as well. Opens the channel of
    // the objects if there are to be any: not over one of `others`, nor where the data of `output` goes, and
    // over an existing file only if `overwrite`. `version`: of the tool. Throws Failure.
    void open(const std::string& output, std::vector<std::string> others, bool overwrite,
              const std::string& version);
};

// For a command line that can't be read: sends the first object if the words ask for one, so that the end can
// be one, too.
void openEventsFor(std::span<char*> words, const std::string& version);
