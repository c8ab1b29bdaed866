// Outputs that are no files: pipes, sockets, terminals, devices. A write waits for the reader and for a
// request to give up, so the descriptor must not block by itself.
#include "core/arch/platform.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>
#include <algorithm>
#include <cerrno>
#include <charconv>
#include <memory>
#include <string_view>
#include <utility>

#include "core/arch/qvcancel.h"

namespace {

constexpr int noReaderRetryMs = 10;
// What a pipe or terminal takes without blocking once it is reported as writable.
constexpr std::size_t safePiece = 512;

enum class Waiting {
    never,       // the file that the shell opened as the standard output
    atRefusal,   // the descriptor is our own and does not block
    perSend,     // a socket: each call asks not to wait
    beforehand,  // shared with other processes, for which it must not change
};

// The number in the name of one of this process's descriptors, -1 for other names.
int ownDescriptor(std::string_view name) {
    if (name == "/dev/stdout") return STDOUT_FILENO;
    if (name == "/dev/stderr") return STDERR_FILENO;
    for (const std::string_view folder : {"/dev/fd/", "/proc/self/fd/"}) {
        if (name.substr(0, folder.size()) != folder) continue;
        const std::string_view digits = name.substr(folder.size());
        int number = -1;
        const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), number);
        return error == std::errc() && end == digits.data() + digits.size() ? number : -1;
    }
    return -1;
}

bool isPipe(const char* name) {
    struct stat facts {};
    if (stat(name, &facts) == 0 && S_ISFIFO(facts.st_mode)) return true;
    errno = ENXIO;
    return false;
}

class StreamOutput {
  public:
    explicit StreamOutput(std::shared_ptr<QvCancel> cancel) : cancel_(std::move(cancel)) {}
    ~StreamOutput() {
        if (descriptor_ >= 0) close(descriptor_);
    }
    StreamOutput(const StreamOutput&) = delete;
    StreamOutput& operator=(const StreamOutput&) = delete;

    bool open(const char* name);
    std::size_t write(const char* data, std::size_t bytes);
    int finish() { return close(std::exchange(descriptor_, -1)); }

  private:
    bool openOwn(int number);
    bool openNamed(const char* name);
    ssize_t put(const char* data, std::size_t bytes) const;
    bool wait(pollfd room, int limitMs);
    bool giveUp();

    std::shared_ptr<QvCancel> cancel_;  // null: waits without limit
    int descriptor_ = -1;
    int request_ = -1;  // readable from a request on
    Waiting waiting_ = Waiting::atRefusal;
};

bool StreamOutput::giveUp() {
    cancel_->noteGivenUp();
    errno = ECANCELED;
    return false;
}

// True once `room` is ready or the limit (-1: none) is over. False without room after a request.
bool StreamOutput::wait(pollfd room, int limitMs) {
    for (;;) {
        const bool requested = cancel_ && cancel_->requested();
        int limit = limitMs;
        if (requested) {
            // The opening of a pipe has nothing that a reader could still take.
            const long long left = room.fd < 0 ? 0 : cancel_->graceLeft();
            if (left == 0) return giveUp();
            limit = static_cast<int>(left / 1'000'000 + 1);
        }
        pollfd both[] = {room, {request_, POLLIN, 0}};
        const int ready = poll(both, requested ? 1 : 2, limit);
        if (ready < 0 && errno != EINTR) return false;
        if (ready > 0 && both[0].revents != 0) return true;
        if (ready == 0 && !requested) return true;
    }
}

// What the shell has opened is written where it stands: its position and its end are shared with what writes
// before and after.
bool StreamOutput::openOwn(int number) {
    struct stat facts {};
    const int flags = fcntl(number, F_GETFL);
    if (flags < 0 || fstat(number, &facts) != 0) return false;
    if ((flags & O_ACCMODE) == O_RDONLY) {
        errno = EBADF;
        return false;
    }
    // O_NONBLOCK is a property that all holders share; the same pipe opened anew has one of its own.
    if (S_ISFIFO(facts.st_mode) || S_ISCHR(facts.st_mode)) {
        const std::string name = "/proc/self/fd/" + std::to_string(number);
        descriptor_ = ::open(name.c_str(), O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
        if (descriptor_ >= 0) return true;
    }
    waiting_ = S_ISREG(facts.st_mode) || S_ISBLK(facts.st_mode) ? Waiting::never
               : S_ISSOCK(facts.st_mode)                        ? Waiting::perSend
                                                                : Waiting::beforehand;
    descriptor_ = fcntl(number, F_DUPFD_CLOEXEC, 0);
    return descriptor_ >= 0;
}

// A blocking open() would return when a reader comes, but nothing could end that wait: so this polls.
bool StreamOutput::openNamed(const char* name) {
    for (;;) {
        descriptor_ = ::open(name, O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
        if (descriptor_ >= 0) return true;
        if (errno == EINTR) continue;
        if (errno != ENXIO || !isPipe(name) || !wait({-1, 0, 0}, noReaderRetryMs)) return false;
    }
}

bool StreamOutput::open(const char* name) {
    if (cancel_ && (request_ = cancel_->descriptor()) < 0) return false;
    const int own = ownDescriptor(name);
    return own >= 0 ? openOwn(own) : openNamed(name);
}

ssize_t StreamOutput::put(const char* data, std::size_t bytes) const {
    if (waiting_ == Waiting::perSend) return send(descriptor_, data, bytes, MSG_DONTWAIT | MSG_NOSIGNAL);
    return ::write(descriptor_, data, waiting_ == Waiting::beforehand ? std::min(bytes, safePiece) : bytes);
}

// The count that was taken; fewer than `bytes` is a failure, with errno.
std::size_t StreamOutput::write(const char* data, std::size_t bytes) {
    std::size_t done = 0;
    while (done < bytes) {
        if (waiting_ == Waiting::beforehand && !wait({descriptor_, POLLOUT, 0}, -1)) break;
        const ssize_t taken = put(data + done, bytes - done);
        if (taken > 0) {
            done += static_cast<std::size_t>(taken);
            continue;
        }
        if (taken == 0) errno = EIO;
        if (taken == 0 || (errno != EAGAIN && errno != EINTR)) break;
        if (errno == EAGAIN && !wait({descriptor_, POLLOUT, 0}, -1)) break;
    }
    return done;
}

StreamOutput& of(void* cookie) { return *static_cast<StreamOutput*>(cookie); }

ssize_t writeStream(void* cookie, const char* data, std::size_t bytes) {
    return static_cast<ssize_t>(of(cookie).write(data, bytes));
}

int closeStream(void* cookie) {
    const std::unique_ptr<StreamOutput> output(&of(cookie));
    return output->finish();
}

std::FILE* openStream(const char* name, const std::shared_ptr<QvCancel>& cancel) {
    auto output = std::make_unique<StreamOutput>(cancel);
    if (!output->open(name)) return nullptr;
    std::FILE* const file = fopencookie(output.get(), "w", {nullptr, writeStream, nullptr, closeStream});
    if (!file) return nullptr;
    output.release();
    // No buffer: what the C library kept back would be written by fclose, after a failure too.
    std::setvbuf(file, nullptr, _IONBF, 0);
    return file;
}

}  // namespace

std::FILE* QvPlatform::openOutput(const char* name, const std::shared_ptr<QvCancel>& cancel, bool& isStream) {
    QvFileStatus facts;
    isStream = ownDescriptor(name) >= 0 || (status(name, facts) && !facts.isRegular && !facts.isFolder);
    return isStream ? openStream(name, cancel) : openFile(name, "wb");
}
