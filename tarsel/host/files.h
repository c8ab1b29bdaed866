// What the file system says of a name that a user gave.
#pragma once

#include <string>

// Why `name` can't be an input: "this is a folder", "no such file", "this is no regular file" or the system's
// own words; "" for a regular file. Symbolic links are followed, and the file is not opened.
std::string whyNoFile(const std::string& name);
// The same; then also "the file is empty", and why the file does not open.
std::string whyNoInput(const std::string& name);

// Why `name` is no folder whose entries can be read, in the same words; "" if it is one.
std::string whyNoFolder(const std::string& name);

bool exists(const std::string& name);
bool isRegularFile(const std::string& name);
// Neither a regular file nor a folder, as "/dev/null" is.
bool isDevice(const std::string& name);
// Whether both names lead, or would lead, to one place.
bool samePlace(const std::string& first, const std::string& second);
long long fileBytes(const std::string& name);  // -1 if there is no such file
