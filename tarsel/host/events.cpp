#include "tarsel/host/events.h"

#include <atomic>
#include <cerrno>
#include <chrono>
#include <cmath>
#include <condition_variable>
#include <cstdio>
#include <cstring>
#include <mutex>
#include <new>

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include "tarsel/host/files.h"
#include "tarsel/host/taskevent.h"
#include "tarsel/host/terminal.h"
#include "tarsel/words/failure.h"
#include "tarsel/words/json.h"
#include "tarsel/words/messages.h"
#include "tarsel/words/systemcause.h"

namespace {

constexpr int kSchema = 1;
constexpr int kSlice = 100;  // ms of a wait for the reader
constexpr int kHurriedSlices = 10;

// A lock that can be waited for with a limit, as std::timed_mutex is, which the thread sanitizer does not
// see.
class Turn {
  public:
    void lock() {
        std::unique_lock hold(lock_);
        free_.wait(hold, [this] { return !taken_; });
        taken_ = true;
    }
    bool try_lock_for(std::chrono::milliseconds limit) {
        std::unique_lock hold(lock_);
        if (!free_.wait_for(hold, limit, [this] { return !taken_; })) return false;
        return taken_ = true;
    }
    void unlock() {
        const std::lock_guard hold(lock_);
        taken_ = false;
        free_.notify_one();
    }

  private:
    std::mutex lock_;
    std::condition_variable free_;
    bool taken_ = false;
};

// Of the one channel. Sending is guarded by `lock`; a reader that takes nothing can hold it for long.
struct Channel {
    Turn lock;
    std::atomic<int> handle{-1};  // our own
    int asked = -1;               // the descriptor that the user named
    std::string name;             // for messages
    std::atomic<bool> ended{false}, hurried{false};
    std::atomic<int> error{0};  // of the first write that failed
    JobFigures last{.state = "running"};
    std::vector<std::string> outputs;
    std::string failure;
    bool kept = false;
    int warnings = 0;
};

Channel& channel() {
    static Channel one;
    return one;
}

bool hasRoom(int handle, int milliseconds) {
    pollfd room{handle, POLLOUT, 0};
    return poll(&room, 1, milliseconds) != 0;  // an error shows at the write
}

void write(Channel& c, const char* text, size_t bytes) {
    while (bytes > 0 && c.error == 0) {
        for (int slices = 0; !hasRoom(c.handle, kSlice); ++slices)
            if (c.hurried && slices >= kHurriedSlices) return;
        const ssize_t written = ::write(c.handle, text, bytes);
        if (written < 0 && (errno == EINTR || errno == EAGAIN)) continue;
        if (written < 0) c.error = errno;
        if (written < 0) return;
        text += written;
        bytes -= static_cast<size_t>(written);
    }
}

void send(Channel& c, const Json& object) {
    // File names need not be UTF-8.
    const std::string line = object.dump(-1, ' ', false, Json::error_handler_t::replace) + "\n";
    write(c, line.data(), line.size());
}

// Rounded in decimal, so that no digits of the binary form show.
Json tenths(double value) {
    return std::isfinite(value) && value >= 0 ? Json(std::round(value * 10) / 10) : Json(nullptr);
}
Json hundredths(double value) {
    return std::isfinite(value) && value >= 0 ? Json(std::round(value * 100) / 100) : Json(nullptr);
}

Json objectOf(const char* event, const JobFigures& f) {
    Json object = Json::object();
    object["schema"] = kSchema;
    object["event"] = event;
    object["state"] = f.state;
    object["percent"] = tenths(f.percent);
    object["eta_s"] = tenths(f.etaSeconds);
    object["elapsed_s"] = hundredths(f.elapsedSeconds);
    object["pass"] = f.pass;
    object["passes"] = f.passes;
    object["frame"] = f.frame;
    object["fps"] = tenths(f.fps);
    object["speed"] = hundredths(f.speed);
    object["out_time_us"] = f.outMicroseconds;
    return object;
}

const char* endState(int status, bool kept) {
    if (status == static_cast<int>(Exit::done)) return kept ? "kept" : "done";
    return status >= static_cast<int>(Exit::hangup) ? "stopped" : "failed";
}

// A descriptor of the user's stays with this program.
int ownHandle(int descriptor) {
    if (descriptor > STDERR_FILENO) fcntl(descriptor, F_SETFD, FD_CLOEXEC);
    return fcntl(descriptor, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
}

int namedDescriptor(const std::string& target) {
    const bool number =
        !target.empty() && target.size() < 6 && target.find_first_not_of("0123456789") == std::string::npos;
    if (target.empty()) return STDERR_FILENO;
    return number ? std::stoi(target) : -1;
}

void openDescriptor(Channel& c, int descriptor) {
    const int mode = fcntl(descriptor, F_GETFL);
    if (mode < 0 || (mode & O_ACCMODE) == O_RDONLY)
        throw failure(Msg::progressNoStream, {"--progress", std::to_string(descriptor)});
    const int own = ownHandle(descriptor);
    if (own < 0) throw systemFailure(Msg::outputSystem, "descriptor " + std::to_string(descriptor), errno);
    c.asked = descriptor;
    c.name = "descriptor " + std::to_string(descriptor);
    c.handle = own;
    if (descriptor != STDERR_FILENO) return;
    // So that nothing else can come between the objects.
    const int nowhere = ::open("/dev/null", O_WRONLY | O_CLOEXEC);
    if (nowhere < 0) return;
    dup2(nowhere, STDERR_FILENO);
    close(nowhere);
}

void openFile(Channel& c, const std::string& name, const std::vector<std::string>& others, bool overwrite) {
    for (const auto& other : others)
        if (samePlace(name, other)) throw failure(Msg::progressOverOther, {name});
    const bool device = isDevice(name);
    const int how = device ? 0 : overwrite ? O_CREAT | O_TRUNC : O_CREAT | O_EXCL;
    const int own = ::open(name.c_str(), O_WRONLY | O_CLOEXEC | O_NOCTTY | how, 0666);
    if (own < 0 && errno == EEXIST) throw failure(Msg::outputExists, {name});
    if (own < 0) throw systemFailure(Msg::outputSystem, name, errno);
    c.name = inQuotes(name);
    c.handle = own;
}

}  // namespace

Events& Events::get() {
    static Events one;
    return one;
}

bool Events::isOpen() const { return channel().handle >= 0; }

int Events::descriptor() const { return channel().asked; }

void Events::open(const std::string& target, const std::vector<std::string>& others, bool overwrite,
                  const std::string& version) {
    Channel& c = channel();
    const int descriptor = namedDescriptor(target);
    descriptor >= 0 ? openDescriptor(c, descriptor) : openFile(c, target, others, overwrite);
    const std::lock_guard guard(c.lock);
    Json start = objectOf("start", c.last);
    start["tool"] = version;
    send(c, start);
}

void Events::progress(const JobFigures& figures) {
    Channel& c = channel();
    const std::lock_guard guard(c.lock);
    c.last = figures;
    if (isOpen() && !c.ended && hasRoom(c.handle, 0)) send(c, objectOf("progress", figures));
}

void Events::remember(const JobFigures& figures) {
    const std::lock_guard guard(channel().lock);
    channel().last = figures;
}

void Events::wrote(const std::vector<std::string>& outputs) {
    const std::lock_guard guard(channel().lock);
    channel().outputs = outputs;
}

std::string Events::lost() const {
    const int error = channel().error;
    if (error == 0) return "";
    const SystemCause cause = causeOf(error);
    return lineOf(Msg::progressLost, {channel().name, cause.why});
}

void Events::kept() {
    const std::lock_guard guard(channel().lock);
    channel().kept = true;
}

void Events::hurry() { channel().hurried = true; }

void Events::end(int status) {
    Channel& c = channel();
    if (!isOpen()) return;
    try {
        const std::unique_lock guard(c.lock, std::chrono::milliseconds(kSlice * kHurriedSlices));
        if (!guard || c.ended.exchange(true)) return;
        const bool done = status == static_cast<int>(Exit::done);
        JobFigures last = c.last;
        last.state = endState(status, c.kept);
        if (done) last.etaSeconds = 0;
        Json object = objectOf("end", last);
        object["status"] = status;
        object["error"] = c.failure.empty() || done ? Json(nullptr) : Json(c.failure);
        object["warnings"] = c.warnings;
        object["outputs"] = c.outputs;
        send(c, object);
    } catch (const std::bad_alloc&) {
        c.ended = false;
        endNow(status);
    }
}

void Events::endNow(int status) {
    Channel& c = channel();
    if (!isOpen() || c.ended.exchange(true)) return;
    char line[512];
    const int length = std::snprintf(line, sizeof line,
                                     "{\"schema\":%d,\"event\":\"end\",\"state\":\"%s\",\"percent\":null,"
                                     "\"eta_s\":null,\"elapsed_s\":null,"
                                     "\"pass\":1,\"passes\":1,\"frame\":%lld,\"fps\":null,\"speed\":null,"
                                     "\"out_time_us\":%lld,\"status\":%d,"
                                     "\"error\":null,\"warnings\":%d,\"outputs\":[]}\n",
                                     kSchema, endState(status, false), c.last.frame, c.last.outMicroseconds,
                                     status, c.warnings);
    c.hurried = true;
    write(c, line, static_cast<size_t>(length));
}

void tell(Level level, const std::string& line) {
    Channel& c = channel();
    if (!Events::get().isOpen() || c.asked != STDERR_FILENO)
        std::fprintf(stderr, "tarsel: %s%s\n", level == Level::warning ? "warning: " : "", line.c_str());
    if (!Events::get().isOpen()) return;
    const std::lock_guard guard(c.lock);
    if (level == Level::warning) ++c.warnings;
    if (level == Level::error) {
        c.failure = line;
        return;
    }
    if (c.ended) return;
    Json object = Json::object();
    object["schema"] = kSchema;
    object["event"] = "message";
    object["level"] = level == Level::warning ? "warning" : "note";
    object["text"] = line;
    send(c, object);
}

void tellTask(const TaskEvent& task) {
    Channel& c = channel();
    if (!Events::get().isOpen()) return;
    const std::lock_guard guard(c.lock);
    const bool ended = task.status >= 0;
    if (c.ended || (!ended && !hasRoom(c.handle, 0))) return;
    Json object = objectOf("task", task.figures);
    object["task"] = task.number;
    object["tasks"] = task.count;
    object["id"] = task.id;
    object["attempt"] = task.attempt;
    object["status"] = ended ? Json(task.status) : Json(nullptr);
    object["error"] = task.failure.empty() ? Json(nullptr) : Json(task.failure);
    object["outputs"] = task.outputs;
    send(c, object);
}

void lastWords(std::string_view line, int status) {
    if (!line.empty() && stderrHasRoom()) writeToStderr(line);
    Channel& c = channel();
    if (!Events::get().isOpen()) return;
    c.hurried = true;
    constexpr std::string_view before = "tarsel: ";
    if (line.starts_with(before) && line.ends_with('\n')) {
        const std::unique_lock guard(c.lock, std::chrono::milliseconds(kSlice));
        if (guard) c.failure = line.substr(before.size(), line.size() - before.size() - 1);
    }
    Events::get().end(status);
}
