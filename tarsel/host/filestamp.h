// By what a file is known again: its size and the time of its last change, or what it holds.
#pragma once

#include <optional>
#include <string>

struct FileStamp {
    long long bytes = 0;
    long long changed = 0;  // nanoseconds since 1970

    bool operator==(const FileStamp&) const = default;
};

// Of what a symbolic link leads to. Nothing for a file that is not there or is no regular one.
std::optional<FileStamp> stampOf(const std::string& name);

// 32 hexadecimal digits of all bytes of a file: MD5 over the MD5 of each block. It is no protection against
// forgery. Throws Failure (input).
std::string digestOfFile(const std::string& name);
// MD5 of a text, 32 hexadecimal digits.
std::string digestOfText(const std::string& text);
