// What a caption file that is refused holds.
#pragma once

#include <string>

// Throws Failure (input) for a file that was refused as SCC: it is none, or has no caption lines.
[[noreturn]] void refuseScc(const std::string& name);
