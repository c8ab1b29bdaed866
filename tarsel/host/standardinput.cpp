#include "tarsel/host/standardinput.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string_view>
#include <vector>

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include "tarsel/words/messages.h"
#include "tarsel/words/timespec.h"

namespace {

constexpr const char* kDevice = "/dev/stdin";
constexpr size_t kBlock = size_t{1} << 20;        // bytes that are moved at a time
constexpr long long kCheckEvery = 16 * kBlock;    // bytes between two looks at the space
constexpr long long kLeftFree = 2 * kCheckEvery;  // other programs need the temporary folder as well

std::string temporaryFolder() { return QvUtil::tempDir().toString().asString(""); }

// A file that has no name, or loses it at once where the file system can't make one without.
int unnamedFile(const std::string& folder) {
    const int number = open(folder.c_str(), O_TMPFILE | O_RDWR | O_CLOEXEC, S_IRUSR | S_IWUSR);
    if (number >= 0) return number;
    std::string name = (std::filesystem::path(folder) / "tarsel-XXXXXX").string();
    const int named = mkostemp(name.data(), O_CLOEXEC);
    if (named >= 0) unlink(name.c_str());
    return named;
}

void checkSpace(int file, const std::string& folder) {
    struct statvfs facts {};
    if (fstatvfs(file, &facts) != 0) return;
    const auto free = static_cast<long long>(facts.f_bavail) * static_cast<long long>(facts.f_frsize);
    if (free < kLeftFree) throw failure(Msg::stdinNoSpace, {folder, formatBytes(free)});
}

// The next bytes, 0 at the end, -1 for an error.
ssize_t readSome(char* to, size_t count) {
    for (;;) {
        const ssize_t got = ::read(STDIN_FILENO, to, count);
        if (got >= 0 || (errno != EINTR && errno != EAGAIN)) return got;
        if (errno == EINTR) continue;
        pollfd ready{STDIN_FILENO, POLLIN, 0};
        poll(&ready, 1, -1);
    }
}

// 0 or an errno.
int writeAll(int file, std::string_view bytes) {
    while (!bytes.empty()) {
        const ssize_t taken = ::write(file, bytes.data(), bytes.size());
        if (taken < 0 && errno == EINTR) continue;
        if (taken <= 0) return taken < 0 ? errno : ENOSPC;
        bytes.remove_prefix(static_cast<size_t>(taken));
    }
    return 0;
}

// Up to `count` bytes of a file from a place on; -1 for an error.
long long readAt(int file, void* to, size_t count, long long at) {
    ssize_t got = -1;
    do got = pread(file, to, count, at);
    while (got < 0 && errno == EINTR);
    return got;
}

// The descriptor's own position stays where it is.
class PartOfFile : public QvByteSource {
  public:
    PartOfFile(int file, long long start, long long bytes) : file_(file), start_(start), bytes_(bytes) {}

  protected:
    long long readSome(void* to, std::size_t count) override {
        const auto wanted =
            static_cast<std::size_t>(std::clamp(bytes_ - at_, 0LL, static_cast<long long>(count)));
        const long long got = readAt(file_, to, wanted, start_ + at_);
        if (got < 0) setReason(std::strerror(errno));
        at_ += std::max(got, 0LL);
        return got;
    }
    bool canMove() const override { return true; }
    bool moveTo(long long position) override {
        at_ = position;
        return true;
    }
    long long length() override { return bytes_; }

  private:
    int file_;
    long long start_, bytes_, at_ = 0;
};

}  // namespace

StandardInput::~StandardInput() {
    if (kept_ >= 0) close(kept_);
}

void StandardInput::take() {
    if (bytes_ >= 0) return;
    struct stat facts {};
    // One that was closed is opened the wrong way round when the program starts.
    const int flags = fcntl(STDIN_FILENO, F_GETFL);
    if (flags < 0 || (flags & O_ACCMODE) == O_WRONLY || fstat(STDIN_FILENO, &facts) != 0)
        throw failure(Msg::stdinClosed, {kName});
    if (isatty(STDIN_FILENO)) throw failure(Msg::stdinIsTerminal, {kName});
    const off_t position = S_ISREG(facts.st_mode) ? lseek(STDIN_FILENO, 0, SEEK_CUR) : -1;
    if (position >= 0) {
        number_ = STDIN_FILENO;
        file_ = kDevice;
        start_ = position;
        bytes_ = std::max<long long>(facts.st_size - position, 0);
    } else {
        keep();
    }
    if (bytes_ == 0) throw failure(Msg::inputEmpty, {kName});
}

void StandardInput::keep() {
    const std::string folder = temporaryFolder();
    kept_ = unnamedFile(folder);
    if (kept_ < 0) throw systemFailure(Msg::stdinNotKept, folder, errno);
    std::vector<char> block(kBlock);
    long long taken = 0, checked = -kCheckEvery;
    for (;;) {
        if (taken - checked >= kCheckEvery) {
            checkSpace(kept_, folder);
            checked = taken;
        }
        const ssize_t got = readSome(block.data(), block.size());
        if (got < 0) throw systemFailure(Msg::inputSystem, kName, errno);
        if (got == 0) break;
        if (const int error = writeAll(kept_, {block.data(), static_cast<size_t>(got)}); error != 0)
            throw systemFailure(Msg::stdinNotKept, folder, error);
        taken += got;
    }
    number_ = kept_;
    bytes_ = taken;
}

std::string StandardInput::firstBytes(size_t most) const {
    std::string bytes(std::min(most, static_cast<size_t>(bytes_)), '\0');
    const long long got = readAt(number_, bytes.data(), bytes.size(), start_);
    bytes.resize(static_cast<size_t>(std::max(got, 0LL)));
    return bytes;
}

std::unique_ptr<QvByteSource> StandardInput::source() const {
    return std::make_unique<PartOfFile>(number_, start_, bytes_);
}

std::shared_ptr<StandardInput> standardInputOf(const std::vector<std::string>& inputs,
                                               const std::string& format) {
    const auto times = std::count(inputs.begin(), inputs.end(), StandardInput::kName);
    if (times > 1) throw failure(Msg::stdinTwice, {StandardInput::kName});
    if (times == 0 && !format.empty()) throw failure(Msg::stdinUnused);
    return times == 0 ? nullptr : std::make_shared<StandardInput>(format);
}
