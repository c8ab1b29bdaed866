// The command of --post.
#pragma once

#include <string>
#include <vector>

// With the placeholders replaced: %i and %o by all inputs or outputs, %i1, %o1, ... by one of them, %op by
// the folder of the first output with a "/" at its end, %ob by that output's name without folder and
// extension and, when there are several, without what follows a "#". Each name is quoted for the shell.
std::string postCommand(const std::string& command, const std::vector<std::string>& inputs,
                        const std::vector<std::string>& outputs);
