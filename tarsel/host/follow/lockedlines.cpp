#include "tarsel/host/follow/lockedlines.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <string_view>

#include <crypto++/crc.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "tarsel/host/follow/filefacts.h"
#include "tarsel/host/follow/filemoves.h"
#include "tarsel/words/messages.h"

namespace {

constexpr size_t kCheckDigits = 8;

std::string checkOf(std::string_view line) {
    CryptoPP::CRC32C crc;
    std::array<unsigned char, CryptoPP::CRC32C::DIGESTSIZE> bytes{};
    crc.CalculateDigest(bytes.data(), reinterpret_cast<const unsigned char*>(line.data()), line.size());
    std::string text;
    for (const unsigned char byte : bytes) {
        char digits[3];
        std::snprintf(digits, sizeof digits, "%02x", byte);
        text += digits;
    }
    return text;
}

std::string checked(const std::string& line) { return checkOf(line) + " " + line + "\n"; }

// 0 or an errno.
int write(int to, const std::string& text) {
    for (size_t at = 0; at < text.size();) {
        const ssize_t written = ::write(to, text.data() + at, text.size() - at);
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) return errno;
        at += static_cast<size_t>(written);
    }
    return ::fdatasync(to) == 0 || errno == EINVAL ? 0 : errno;
}

}  // namespace

LockedLines::LockedLines(const std::string& name) : name_(name) { open(); }

void LockedLines::open() {
    for (;;) {
        Descriptor file(::open(name_.c_str(), O_RDWR | O_CREAT | O_APPEND | O_CLOEXEC | O_NOFOLLOW, 0666));
        if (!file) throw systemFailure(Msg::watchMemory, name_, errno);
        // A file system without locks has one user as well.
        if (::flock(file.get(), LOCK_EX | LOCK_NB) != 0 && errno == EWOULDBLOCK)
            throw failure(Msg::watchTwice, {name_});
        struct stat status {};
        const FileFacts facts = factsOf(name_);
        // Another process may have replaced it before the lock was had.
        if (::fstat(file.get(), &status) == 0 && facts.inode == status.st_ino) {
            if (facts.kind != FileFacts::Kind::file) throw failure(Msg::inputNotRegular, {name_});
            file_ = std::move(file);
            return;
        }
    }
}

std::vector<std::string> LockedLines::lines() const {
    std::string text;
    std::array<char, 65536> block{};
    for (off_t at = 0;;) {
        const ssize_t got = ::pread(file_.get(), block.data(), block.size(), at);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) throw systemFailure(Msg::inputSystem, name_, errno);
        if (got == 0) break;
        text.append(block.data(), static_cast<size_t>(got));
        at += got;
    }
    std::vector<std::string> found;
    for (size_t at = 0, end = 0; (end = text.find('\n', at)) != std::string::npos; at = end + 1) {
        const std::string_view line = std::string_view(text).substr(at, end - at);
        if (line.size() <= kCheckDigits) continue;
        const std::string_view rest = line.substr(kCheckDigits + 1);
        if (line.substr(0, kCheckDigits) == checkOf(rest)) found.emplace_back(rest);
    }
    return found;
}

void LockedLines::add(const std::string& line) {
    struct stat before {};
    char last = '\n';
    if (::fstat(file_.get(), &before) == 0 && before.st_size > 0 &&
        ::pread(file_.get(), &last, 1, before.st_size - 1) != 1)
        last = 0;
    // After a torn line.
    const int error = write(file_.get(), (last == '\n' ? "" : "\n") + checked(line));
    if (error == 0) return;
    [[maybe_unused]] const bool cut = ::ftruncate(file_.get(), before.st_size) == 0;
    throw systemFailure(Msg::watchMemory, name_, error);
}

void LockedLines::replace(const std::vector<std::string>& lines) {
    const std::string next = name_ + ".new";
    Descriptor file(
        ::open(next.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_APPEND | O_CLOEXEC | O_NOFOLLOW, 0666));
    if (!file) throw systemFailure(Msg::watchMemory, next, errno);
    std::string text;
    for (const std::string& line : lines) text += checked(line);
    int error = write(file.get(), text);
    ::flock(file.get(), LOCK_EX | LOCK_NB);
    if (error == 0 && ::rename(next.c_str(), name_.c_str()) != 0) error = errno;
    if (error != 0) {
        ::unlink(next.c_str());
        throw systemFailure(Msg::watchMemory, name_, error);
    }
    syncFolder(std::filesystem::path(name_).parent_path().string());
    file_ = std::move(file);
}
