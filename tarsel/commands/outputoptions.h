// The options of commands that write files.
#pragma once

#include <string>

#include "tarsel/host/outputs/outputs.h"

class Command;

struct OutputOptions {
    bool overwrite = false, keep = false, noSync = false;
    std::string stale;

    void add(Command& command);
    // Throws Failure (usage).
    OutputPolicy policy() const;
};

// --threads: how many threads of the engine share the work on pictures.
void addThreads(Command& command, std::string& threads);
// The number, 0 for none. Throws Failure (usage). Before the first picture.
int limitThreads(const std::string& threads);
