#include "tarsel/host/files.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <new>

#include <fcntl.h>
#include <glob.h>
#include <unistd.h>

#include "tarsel/host/descriptor.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/systemcause.h"

namespace fs = std::filesystem;

namespace {

[[noreturn]] void refuseInput(const std::string& name, int error) {
    throw systemFailure(Msg::inputSystem, name, error);
}

}  // namespace

void requireFile(const std::string& name) {
    std::error_code error;
    const auto status = fs::status(name, error);
    if (fs::is_regular_file(status)) return;
    if (fs::is_directory(status)) throw failure(Msg::inputIsFolder, {name});
    if (fs::exists(status)) throw failure(Msg::inputNotRegular, {name});
    if (error && error != std::errc::no_such_file_or_directory) refuseInput(name, error.value());
    throw failure(Msg::inputAbsent, {name});
}

void requireInput(const std::string& name) {
    requireFile(name);
    if (fileBytes(name) == 0) throw failure(Msg::inputEmpty, {name});
    FILE* file = std::fopen(name.c_str(), "rb");
    if (!file) refuseInput(name, errno);
    std::fclose(file);
}

void requireLog(const std::string& name) {
    if (isDevice(name)) return;
    FILE* file = std::fopen(name.c_str(), "ab");
    if (!file) throw systemFailure(Msg::logNotWritten, name, errno);
    std::fclose(file);
}

void requireOwnLog(const std::string& name, const std::vector<std::string>& words) {
    if (isDevice(name)) return;
    const auto check = [&](const std::string& other) {
        std::error_code error;
        // What is there already, and an output that will be.
        const bool isFile = exists(other) || other.find_first_of("./") != std::string::npos;
        if (isFile && (fs::equivalent(other, name, error) || samePlace(other, name)))
            throw failure(Msg::logIsOther, {name, other});
    };
    bool isLogs = false;
    for (const auto& word : words) {
        const bool skip = isLogs || word.rfind("--log=", 0) == 0;
        isLogs = word == "--log";
        if (skip || word.empty()) continue;
        check(word);
        // FILE@X,Y and NAME:key=FILE,key=FILE
        for (const char* ends : {"=", "=,", "@"})
            for (size_t at = 0; at < word.size();) {
                const size_t end = std::min(word.find_first_of(ends, at), word.size());
                if (end > at) check(word.substr(at, end - at));
                at = end + 1;
            }
    }
}

Failure failureOf(const std::system_error& error) {
    const SystemCause cause = causeOf(error.code().value());
    const auto* failed = dynamic_cast<const fs::filesystem_error*>(&error);
    const std::string path = failed ? failed->path1().string() : "";
    if (path.empty()) return failure(Msg::systemFailed, {cause.why, cause.remedy});
    return failure(Msg::pathFailed, {path.substr(0, path.find("/.tarsel-")), cause.why, cause.remedy});
}

std::string firstBytes(const std::string& name, size_t most) { return bytesAt(name, 0, most); }

std::string bytesAt(const std::string& name, long long from, size_t most) {
    std::string bytes(most, '\0');
    FILE* file = std::fopen(name.c_str(), "rb");
    if (!file) refuseInput(name, errno);
    errno = 0;
    if (from > 0) std::fseek(file, static_cast<long>(from), SEEK_SET);
    bytes.resize(std::fread(bytes.data(), 1, most, file));
    const int error = errno;
    std::fclose(file);
    if (bytes.size() < most && error != 0) refuseInput(name, error);
    return bytes;
}

void requireNoFolder(const std::string& name, const std::string& extension) {
    std::error_code error;
    if (!name.ends_with('/') && !fs::is_directory(name, error)) return;
    throw failure(Msg::outputNamesFolder, {name, (fs::path(name) / ("NAME." + extension)).string()});
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

std::string absoluteName(const std::string& name) { return fs::absolute(name).lexically_normal().string(); }

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

long long modifiedTime(const std::string& name) {
    std::error_code error;
    const auto time = fs::last_write_time(name, error);
    return error ? -1 : static_cast<long long>(time.time_since_epoch().count());
}

int writeFile(const std::string& name, const std::string& text) {
    std::FILE* file = std::fopen(name.c_str(), "wb");
    if (!file) return errno;
    const bool taken = std::fwrite(text.data(), 1, text.size(), file) == text.size();
    const int error = errno;
    if (std::fclose(file) != 0 && taken) return errno;
    return taken ? 0 : error;
}

std::string resolvedName(const std::string& name) {
    std::error_code error;
    const fs::path resolved = fs::weakly_canonical(absoluteName(name), error);
    return error ? absoluteName(name) : resolved.string();
}

std::vector<std::string> filesMatching(const std::string& pattern) {
    glob_t found{};
    std::vector<std::string> names;
    const int result = glob(pattern.c_str(), 0, nullptr, &found);
    for (size_t i = 0; result == 0 && i < found.gl_pathc; ++i)
        if (isRegularFile(found.gl_pathv[i])) names.emplace_back(found.gl_pathv[i]);
    globfree(&found);
    if (result == GLOB_NOSPACE) throw std::bad_alloc();
    return names;
}

void enterFolder(const std::string& name) {
    std::error_code error;
    fs::current_path(name, error);
    if (error) throw systemFailure(Msg::inputSystem, name, error.value());
}

std::string workingFolder() {
    std::error_code error;
    return fs::current_path(error).string();
}

void requireFolder(const std::string& folder, const std::string& output) {
    std::error_code error;
    if (!fs::is_directory(folder, error)) throw failure(Msg::outputFolderAbsent, {output, folder});
}

void removeFile(const std::string& name) {
    std::error_code error;
    fs::remove(name, error);
}

void makeFolder(const std::string& name) {
    std::error_code error;
    fs::create_directory(name, error);
    if (error) throw failureOf(fs::filesystem_error("", name, error));
}

void makeHole(const std::string& name, long long bytes) {
    const Descriptor file(open(name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600));
    if (!file || ftruncate(file.get(), bytes) != 0)
        throw failureOf(fs::filesystem_error("", name, std::error_code(errno, std::generic_category())));
}

void moveFile(const std::string& name, const std::string& to) {
    std::error_code error;
    fs::rename(name, to, error);
    if (error) throw failureOf(fs::filesystem_error("", to, error));
}

void removeTree(const std::string& name) {
    std::error_code error;
    fs::remove_all(name, error);
}
