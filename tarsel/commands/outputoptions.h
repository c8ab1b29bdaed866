// The options of commands that write files.
#pragma once

#include <string>

#include "tarsel/host/outputs/outputs.h"

class Command;

struct OutputOptions {
    bool overwrite = false, noSync = false;
    std::string stale;

    void add(Command& command);
    // Throws Failure (usage).
    OutputPolicy policy() const;
};
