#include "tarsel/host/console.h"

#include <cerrno>
#include <cstdarg>
#include <cstdio>

#include <fcntl.h>
#include <unistd.h>

#include "tarsel/words/messages.h"
#include "tarsel/words/systemcause.h"

namespace {

constexpr size_t kBlock = 1 << 16;
std::string g_pending;

[[noreturn]] void refuse(int error) {
    if (error == EPIPE) throw Failure(Exit::output, "");
    const SystemCause cause = causeOf(error);
    throw failure(Msg::standardOutput, {cause.why, cause.remedy});
}

}  // namespace

void claimStreams() {
    // The wrong way round: a read or write fails as on a closed stream.
    constexpr int modes[] = {O_WRONLY, O_RDONLY, O_RDONLY};
    for (int fd = 0; fd < 3; ++fd)
        if (fcntl(fd, F_GETFD) < 0 && open("/dev/null", modes[fd]) < 0) _exit(static_cast<int>(Exit::failed));
}

void print(const char* format, ...) {
    va_list arguments;
    va_start(arguments, format);
    char* text = nullptr;
    const int length = vasprintf(&text, format, arguments);
    va_end(arguments);
    if (length < 0) throw std::bad_alloc();
    g_pending.append(text, static_cast<size_t>(length));
    std::free(text);
    if (g_pending.size() >= kBlock) flushOutput();
}

void printText(const std::string& text) {
    g_pending += text;
    if (g_pending.size() >= kBlock) flushOutput();
}

void flushOutput() {
    const std::string text = std::move(g_pending);
    g_pending.clear();
    for (size_t done = 0; done < text.size();) {
        const ssize_t written = write(STDOUT_FILENO, text.data() + done, text.size() - done);
        if (written < 0 && errno == EINTR) continue;
        if (written < 0) refuse(errno);
        done += static_cast<size_t>(written);
    }
}
