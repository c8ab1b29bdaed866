// Moves, synchronisation and listing in folders that are open, so that no symbolic link and no renamed parent
// leads elsewhere. Names are those of one entry. Each operation reports 0 or an errno.
#pragma once

#include <string>
#include <string_view>
#include <vector>

// A folder for reading and synchronisation, or, where its names may not be read, for its entries alone.
int openFolder(const char* name);

// Whether `name` is one entry of a folder: not empty, no "/", neither "." nor "..".
bool isEntryName(std::string_view name);
bool entryExists(int folder, const char* name);
// Whether the open folder has been removed.
bool isRemoved(int folder);
// All entries but "." and "..".
int listFolder(int folder, std::vector<std::string>& names);

// EEXIST if `to` has an entry of the new name, also on file systems that can't refuse it in one step. Takes
// no memory.
int moveEntry(int from, const char* name, int to, const char* newName);
// Replaces what has the new name, in one step. Takes no memory.
int renameOver(int from, const char* name, int to, const char* newName);
// Exchanges two entries in one step; ENOENT if one of them is absent, EINVAL where it can't be done. Takes no
// memory.
int exchangeEntries(int first, const char* name, int second, const char* otherName);

// To the disk: the data of a file, the entries of a folder, everything of the file system that `folder` is
// on. What can't be synchronised because the file system knows no such thing is no error.
int syncFile(int folder, const char* name);
int syncFolder(int folder);
int syncFileSystem(int folder);

// Makes a file of these bytes, which must not exist.
int writeEntry(int folder, const char* name, std::string_view bytes);
// The bytes of a regular file; EFBIG if there are more than `most`.
int readEntry(int folder, const char* name, size_t most, std::string& bytes);
