#include "tarsel/host/files.h"

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <filesystem>

#include "tarsel/words/failure.h"

namespace fs = std::filesystem;

std::string whyNoFile(const std::string& name) {
    std::error_code error;
    const auto status = fs::status(name, error);
    if (fs::is_directory(status)) return "this is a folder";
    if (!fs::exists(status))
        return error && error != std::errc::no_such_file_or_directory ? inLine(error.message())
                                                                      : "no such file";
    return fs::is_regular_file(status) ? "" : "this is no regular file";
}

std::string whyNoInput(const std::string& name) {
    if (const std::string why = whyNoFile(name); !why.empty()) return why;
    if (fileBytes(name) == 0) return "the file is empty";
    FILE* file = std::fopen(name.c_str(), "rb");
    if (!file) return std::strerror(errno);
    std::fclose(file);
    return "";
}

std::string whyNoFolder(const std::string& name) {
    std::error_code error;
    const auto status = fs::status(name, error);
    if (!fs::exists(status))
        return error && error != std::errc::no_such_file_or_directory ? inLine(error.message())
                                                                      : "no such folder";
    if (!fs::is_directory(status)) return "this is no folder";
    const fs::directory_iterator entries(name, error);
    return error ? inLine(error.message()) : "";
}

bool exists(const std::string& name) {
    std::error_code error;
    return fs::exists(name, error);
}

bool isRegularFile(const std::string& name) {
    std::error_code error;
    return fs::is_regular_file(name, error);
}

bool isDevice(const std::string& name) {
    std::error_code error;
    const auto status = fs::status(name, error);
    return fs::exists(status) && !fs::is_regular_file(status) && !fs::is_directory(status);
}

bool samePlace(const std::string& first, const std::string& second) {
    std::error_code error;
    return fs::weakly_canonical(first, error) == fs::weakly_canonical(second, error);
}

long long fileBytes(const std::string& name) {
    std::error_code error;
    const auto size = fs::file_size(name, error);
    return error ? -1 : static_cast<long long>(size);
}
