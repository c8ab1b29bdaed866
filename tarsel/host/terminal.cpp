#include "tarsel/host/terminal.h"

#include <cstdlib>

#include <fcntl.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <unistd.h>

bool stderrIsTerminal() { return isatty(STDERR_FILENO) == 1; }

bool colourWanted() {
    const char* noColor = std::getenv("NO_COLOR");
    return !(noColor && *noColor);
}

int terminalColumns() {
    winsize size{};
    return ioctl(STDERR_FILENO, TIOCGWINSZ, &size) == 0 ? size.ws_col : 0;
}

bool stderrHasRoom() {
    pollfd room{STDERR_FILENO, POLLOUT, 0};
    return poll(&room, 1, 0) == 1 && (room.revents & POLLOUT) != 0;
}

bool writeToStderr(std::string_view text) { return write(STDERR_FILENO, text.data(), text.size()) >= 0; }

void leave(int status) { _exit(status); }

QuietStderr::QuietStderr(bool on) {
    if (!on) return;
    saved_ = fcntl(STDERR_FILENO, F_DUPFD_CLOEXEC, 3);
    const int nowhere = open("/dev/null", O_WRONLY | O_CLOEXEC);
    if (saved_ >= 0 && nowhere >= 0) dup2(nowhere, STDERR_FILENO);
    if (nowhere >= 0) close(nowhere);
}

QuietStderr::~QuietStderr() {
    if (saved_ < 0) return;
    dup2(saved_, STDERR_FILENO);
    close(saved_);
}
