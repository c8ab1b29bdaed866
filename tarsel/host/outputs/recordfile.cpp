#include "tarsel/host/outputs/recordfile.h"

#include <cerrno>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <thread>

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include "tarsel/host/outputs/foldercalls.h"
#include "tarsel/host/outputs/owner.h"
#include "tarsel/words/messages.h"

namespace fs = std::filesystem;

namespace {

constexpr size_t kSumDigits = 16;
constexpr int kLockTries = 250;
constexpr std::chrono::milliseconds kLockPause{20};
constexpr size_t kMostBytes = size_t{1} << 30;  // of a file; what is longer was not written here

// FNV-1a of 64 bits.
std::string checksum(std::string_view text) {
    uint64_t sum = 0xcbf29ce484222325;
    for (const char c : text) sum = (sum ^ static_cast<unsigned char>(c)) * 0x100000001b3;
    char digits[kSumDigits + 1];
    std::snprintf(digits, sizeof digits, "%016llx", static_cast<unsigned long long>(sum));
    return digits;
}

[[noreturn]] void refuse(const std::string& name, int error) {
    throw systemFailure(Msg::outputSystem, name, error);
}

int flockFor(int file, int how) {
    int result;
    do result = flock(file, how);
    while (result != 0 && errno == EINTR);
    return result == 0 ? 0 : errno;
}

bool writeAll(int file, std::string_view bytes) {
    while (!bytes.empty()) {
        const ssize_t written = write(file, bytes.data(), bytes.size());
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) return false;
        bytes.remove_prefix(static_cast<size_t>(written));
    }
    return true;
}

// Makes the folder of `name` if it is missing.
void makeFolderOf(const std::string& name) {
    const fs::path folder = fs::path(name).parent_path();
    std::error_code error;
    fs::create_directories(folder, error);
    if (error) refuse(folder.string(), error.value());
}

Descriptor openShared(const std::string& name) {
    makeFolderOf(name);
    Descriptor file(open(name.c_str(), O_RDWR | O_CREAT | O_APPEND | O_CLOEXEC | O_NOFOLLOW, 0666));
    if (!file) refuse(name, errno);
    return file;
}

// 0 or an errno; `bytes` has what came before it.
int readAll(int file, std::string& bytes) {
    char block[16384];
    for (off_t at = 0; bytes.size() < kMostBytes; at = static_cast<off_t>(bytes.size())) {
        const ssize_t got = pread(file, block, sizeof block, at);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) return errno;
        if (got == 0) break;
        bytes.append(block, static_cast<size_t>(got));
    }
    return 0;
}

std::string contentsOf(int file) {
    std::string bytes;
    return readAll(file, bytes) == 0 ? bytes : "";
}

std::string checked(std::string_view text) { return checksum(text) + " " + std::string(text) + "\n"; }

std::vector<std::string> wholeLines(std::string_view bytes) {
    std::vector<std::string> lines;
    for (size_t at = 0, end; (end = bytes.find('\n', at)) != std::string_view::npos; at = end + 1) {
        const std::string_view line = bytes.substr(at, end - at);
        if (line.size() <= kSumDigits + 1 || line[kSumDigits] != ' ') continue;
        const std::string_view text = line.substr(kSumDigits + 1);
        if (line.substr(0, kSumDigits) == checksum(text)) lines.emplace_back(text);
    }
    return lines;
}

// What can't be brought to the disk because the file system knows no such thing is no error.
int toDisk(int file) { return fdatasync(file) == 0 || errno == EINVAL ? 0 : errno; }

int enterInFolder(const std::string& name) {
    const Descriptor folder(openFolder(fs::path(name).parent_path().c_str()));
    return folder ? syncFolder(folder.get()) : errno;
}

// Whether the open file is the one that has the name: another process may have removed or replaced it.
bool hasName(int file, const std::string& name) {
    struct stat own, named;
    return fstat(file, &own) == 0 && lstat(name.c_str(), &named) == 0 && own.st_ino == named.st_ino &&
           own.st_dev == named.st_dev;
}

}  // namespace

RecordFile::RecordFile(const std::string& name) : name_(name) { openFile(); }

void RecordFile::openFile() {
    file_ = openShared(name_);
    struct stat status;
    if (fstat(file_.get(), &status) != 0) refuse(name_, errno);
    if (!S_ISREG(status.st_mode)) throw failure(Msg::inputNotRegular, {name_});
    entered_ = false;
}

bool RecordFile::tryLock() {
    for (;; openFile()) {
        const int error = flockFor(file_.get(), LOCK_EX | LOCK_NB);
        if (error == EWOULDBLOCK) return false;
        if (error != 0) refuse(name_, error);
        if (hasName(file_.get(), name_)) return true;
    }
}

void RecordFile::lock() {
    for (;; openFile()) {
        if (const int error = flockFor(file_.get(), LOCK_EX)) refuse(name_, error);
        if (hasName(file_.get(), name_)) return;
    }
}

void RecordFile::append(std::string_view text, bool sync) {
    struct stat status;
    if (fstat(file_.get(), &status) != 0) refuse(name_, errno);
    char last = '\n';
    if (status.st_size > 0 && pread(file_.get(), &last, 1, status.st_size - 1) != 1) refuse(name_, errno);
    std::string line = last == '\n' ? "" : "\n";  // after one that was cut
    line += checked(text);
    int error = writeAll(file_.get(), line) ? 0 : errno;
    if (error == 0 && sync) error = toDisk(file_.get());
    if (error == 0 && sync && !entered_) error = enterInFolder(name_);
    if (error != 0) {
        [[maybe_unused]] const bool cut = ftruncate(file_.get(), status.st_size) == 0;
        refuse(name_, error);
    }
    entered_ = entered_ || sync;
}

void RecordFile::replace(const std::vector<std::string>& lines) {
    const std::string next = name_ + ".new";
    unlink(next.c_str());  // that an ended process has left
    Descriptor file = openShared(next);
    std::string text;
    for (const std::string& line : lines) text += checked(line);
    int error = writeAll(file.get(), text) ? toDisk(file.get()) : errno;
    if (error == 0) error = flockFor(file.get(), LOCK_EX | LOCK_NB);
    if (error == 0 && rename(next.c_str(), name_.c_str()) != 0) error = errno;
    if (error != 0) {
        unlink(next.c_str());
        refuse(name_, error);
    }
    file_ = std::move(file);
    entered_ = enterInFolder(name_) == 0;
}

std::vector<std::string> RecordFile::lines() const {
    std::string bytes;
    if (const int error = readAll(file_.get(), bytes)) throw systemFailure(Msg::inputSystem, name_, error);
    return wholeLines(bytes);
}

bool RecordFile::isLocked(const std::string& name) {
    const Descriptor file(open(name.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    return file && flockFor(file.get(), LOCK_SH | LOCK_NB) == EWOULDBLOCK;
}

std::vector<std::string> RecordFile::read(const std::string& name) {
    const Descriptor file(open(name.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK));
    return file ? wholeLines(contentsOf(file.get())) : std::vector<std::string>();
}

NamedLock::NamedLock(const std::string& name, const std::string& shown) : file_(openShared(name)) {
    int error = flockFor(file_.get(), LOCK_EX | LOCK_NB);
    for (int tries = 0; error == EWOULDBLOCK; ++tries) {
        const auto owner = Owner::parse(contentsOf(file_.get()));
        // What a killed one has left takes a moment to go, and one that begins takes one to say who it is.
        const bool settled = owner && owner->state() != Owner::State::gone;
        if (settled || tries == kLockTries)
            throw failure(Msg::batchRuns, {shown, owner ? std::to_string(owner->pid) : "?",
                                           owner ? owner->host : "another host"});
        std::this_thread::sleep_for(kLockPause);
        error = flockFor(file_.get(), LOCK_EX | LOCK_NB);
    }
    if (error != 0) refuse(name, error);
    if (ftruncate(file_.get(), 0) != 0 || !writeAll(file_.get(), Owner::self().text())) refuse(name, errno);
}
