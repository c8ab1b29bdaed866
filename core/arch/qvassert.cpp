#include "core/arch/qvassert.h"

#include <atomic>
#include <filesystem>
#include <string>

#include "core/arch/qvexception.h"

namespace {

std::atomic<QvAssertLog> assertLog{nullptr};

// The floor of the tree that a file belongs to: the last folder of that name on its way, or the folder that
// the file is in.
std::string floorOf(const std::filesystem::path& file) {
    std::string found;
    for (const auto& folder : file.parent_path())
        if (folder == "core" || folder == "builtin") found = folder.string();
    return found.empty() ? file.parent_path().filename().string() : found;
}

std::string locationOf(const char* file, int line) {
    const std::filesystem::path path(file ? file : "");
    const std::string floor = floorOf(path);
    return (floor.empty() ? "" : floor + "/") + path.stem().string() + "(" + std::to_string(line) + ")";
}

template <class Failure>
[[noreturn]] void fail(const char* location, const char* message) {
    std::string text = "*** Assertion failed at ";
    text += location ? location : "";
    if (message) text.append(": \n").append(message);
    if (const QvAssertLog log = assertLog) log(text.c_str());
    throw Failure(text.c_str());
}

}  // namespace

void qvSetAssertLog(QvAssertLog log) { assertLog = log; }

void qvAssertFail(const char* location, const char* message) { fail<QvAssertFailure>(location, message); }

void qvAssertFailAt(const char* file, int line, const char* message) {
    qvAssertFail(locationOf(file, line).c_str(), message);
}

void qvAssertMemoryAt(const char* file, int line, const char* message) {
    fail<QvMemoryFailure>(locationOf(file, line).c_str(), message);
}
