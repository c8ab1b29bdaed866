// Files that are put away: nothing is ever overwritten, and nothing is lost.
#pragma once

#include <string>

#include "tarsel/host/follow/filefacts.h"

// Moves a file into a folder, which is made if it is missing, under its own name or, where that is taken,
// under "NAME (2).EXT" and so on. To another disk it is copied, and removed once the copy is on the disk.
// Returns the new name. Throws Failure (output), also when the file is no longer the one of `facts`; it then
// stays.
std::string moveInto(const std::string& file, const std::string& folder, const FileFacts& facts);

// Throws Failure (output), also when the file is no longer the one of `facts`; it then stays.
void removeFile(const std::string& file, const FileFacts& facts);

// Writes a text to a new file and brings it to the disk. Throws Failure (output), and leaves nothing then.
void writeNewFile(const std::string& name, const std::string& text);

// Brings the entries of a folder to the disk, as far as its file system does that.
void syncFolder(const std::string& folder);
