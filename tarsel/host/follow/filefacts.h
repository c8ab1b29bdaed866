// What the system says of a file that others may still be writing.
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <vector>

struct FileFacts {
    enum class Kind { absent, file, folder, link, other };
    Kind kind = Kind::absent;
    long long bytes = 0;
    long long modified = 0;  // nanoseconds since 1970
    unsigned long long device = 0, inode = 0;

    bool operator==(const FileFacts&) const = default;
};

// Links are not followed.
FileFacts factsOf(const std::string& path);

// The entries of a folder without "." and "..", in no order. Throws Failure (input).
std::vector<std::string> namesIn(const std::string& folder);

// Whether a process has the file open for writing. False also where the system can't tell, as for a writer on
// another machine.
bool isBeingWritten(const std::string& file);

// Whether other machines may change the folder, of which this one then gets no notice.
bool isNetworkFolder(const std::string& folder);

// SHA-256 of the content in hexadecimal; nothing once `stop` answers true, which is asked every few
// milliseconds. Throws Failure (input).
std::optional<std::string> digestOf(const std::string& file, const std::function<bool()>& stop);

// The name without links, "." and ".."; what does not exist yet keeps its name.
std::string realName(const std::string& name);
// Whether `inner` is the folder `outer` or below it; both as realName gives them.
bool isWithin(const std::string& inner, const std::string& outer);
// With all folders above it. Throws Failure (output).
void makeFolders(const std::string& folder);
