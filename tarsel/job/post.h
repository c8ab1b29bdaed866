// The command of --post.
#pragma once

#include <string>
#include <vector>

#include "tarsel/host/signals.h"

// With the placeholders replaced: %i and %o by all inputs or outputs, %i1, %o1, ... by one of them, %op by
// the folder of the first output with a "/" at its end, %ob by that output's name without folder and
// extension and, when there are several, without what follows a "#". Each name is quoted for the shell.
std::string postCommand(const std::string& command, const std::vector<std::string>& inputs,
                        const std::vector<std::string>& outputs);

// Whether this input's name would be in the command that is run.
bool postNames(const std::string& command, const std::vector<std::string>& inputs, const std::string& input);

struct PostJob {
    const std::string& command;
    const std::vector<std::string>& inputs;
    const std::vector<std::string>& outputs;
    const std::string& output;  // its name, for messages
    bool outputTaken;           // the standard output has the result
};

// Runs it and waits for its end; signals are passed on to it. Throws Failure if it could not be run or did
// not end with status 0.
void runPost(const PostJob& job, Signals& signals);
