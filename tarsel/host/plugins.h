// Plug-ins of a folder, and what the tool says of those that do not load.
#pragma once

#include <string>

// Loads them, and prints a warning for each one that was not loaded. A plug-in that ends the program in its
// start, by a crash, exit() or quick_exit(), is named in the program's last line, and the status is that of a
// missing module. Nothing can notice _exit().
void loadPlugins(const std::string& folder);
// Those that came with the library, in a folder near its own; without that folder nothing is said. True if
// some are there.
bool loadOwnPlugins();
int pluginWarnings();  // how many were printed

// For the end of the program by std::terminate: if a plug-in is being loaded, names it and ends the program
// at once; returns if none is.
void blameLoadingPlugin(const char* why);
