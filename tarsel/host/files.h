// What the file system says of a name that a user gave.
#pragma once

#include <string>
#include <system_error>
#include <vector>

#include "tarsel/words/failure.h"

// Throws Failure (input) unless `name` is a regular file. Symbolic links are followed, and the file is not
// opened.
void requireFile(const std::string& name);
// The same; then also for a file that is empty or does not open.
void requireInput(const std::string& name);

// Throws Failure (output) if the engine's log can't be written to `name`, which may make the file.
void requireLog(const std::string& name);
// Throws Failure (output) if a log of this name would take the place of another file that the words of a
// command line name, by themselves or within an option's value.
void requireOwnLog(const std::string& name, const std::vector<std::string>& words);

// What a call of the standard library ran into that nothing else has caught. Of a hidden work folder, the
// folder that it is in is named.
Failure failureOf(const std::system_error& error);

// The first bytes of a file, fewer where it ends before. A file that can't be read is refused.
std::string firstBytes(const std::string& name, size_t most);

// So many bytes of a file from a place on, fewer where it ends before. Throws Failure (input).
std::string bytesAt(const std::string& name, long long from, size_t most);

// A folder in one that is there. Throws Failure (output).
void makeFolder(const std::string& name);
// A file of so many bytes 0 that takes no room on the disk. Throws Failure (output).
void makeHole(const std::string& name, long long bytes);
// A file gets another name on the same file system, in place of what has it. Throws Failure (output).
void moveFile(const std::string& name, const std::string& to);
// A folder and all in it, as far as this process may.
void removeTree(const std::string& name);

// Throws Failure (output) if the name of an output is that of a folder, with the name of a file in it as a
// hint.
void requireNoFolder(const std::string& name, const std::string& extension);

// Why `name` is no folder whose entries can be read, in the same words; "" if it is one.
std::string whyNoFolder(const std::string& name);

// The name from the root on, without "." and "..".
std::string absoluteName(const std::string& name);
bool exists(const std::string& name);
bool isRegularFile(const std::string& name);
// Neither a regular file nor a folder, as "/dev/null" is.
bool isDevice(const std::string& name);
// Whether both names lead, or would lead, to one place.
bool samePlace(const std::string& first, const std::string& second);
// Makes the file, or empties it, and writes `text`. 0 or an errno.
int writeFile(const std::string& name, const std::string& text);
long long fileBytes(const std::string& name);     // -1 if there is no such file
long long modifiedTime(const std::string& name);  // a count that grows; -1 if there is no such file
// The same with all symbolic links followed, as far as there is something.
std::string resolvedName(const std::string& name);
// Regular files whose names match a pattern of a shell ("in/*.wav"), sorted.
std::vector<std::string> filesMatching(const std::string& pattern);
// Makes it the working folder. Throws Failure (input).
void enterFolder(const std::string& name);
std::string workingFolder();
// Throws Failure (output) if the folder that is to get `output` is not there.
void requireFolder(const std::string& folder, const std::string& output);
// Nothing if it is not there.
void removeFile(const std::string& name);
