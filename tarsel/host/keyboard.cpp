#include "tarsel/host/keyboard.h"

#include <cerrno>
#include <mutex>
#include <system_error>

#include <fcntl.h>
#include <poll.h>
#include <termios.h>
#include <unistd.h>

namespace {

std::mutex g_lock;    // of the mode of the terminal
bool g_away = false;  // the process stops or is stopped; guarded by g_lock

}  // namespace

// Keys arrive one by one while the terminal is taken.
struct Keyboard::Terminal {
    int device = -1;
    int wake[2] = {-1, -1};
    termios former{};
    std::atomic<bool> taken{false};

    ~Terminal() {
        if (device < 0) return;
        giveBack();
        for (int fd : {device, wake[0], wake[1]})
            if (fd >= 0) close(fd);
    }

    bool inForeground() const { return tcgetpgrp(device) == getpgrp(); }

    bool open() {
        device = ::open("/dev/tty", O_RDONLY | O_CLOEXEC | O_NOCTTY);
        if (device < 0) return false;
        if (!inForeground() || pipe2(wake, O_CLOEXEC) != 0) {
            close(device);
            device = -1;
            return false;
        }
        return g_away || take();
    }

    // Again after each stop: of one that nobody announces only the shell knows, and it has changed the mode.
    bool take() {
        if (!inForeground() || (!taken && tcgetattr(device, &former) != 0)) return false;
        termios keys = former;
        keys.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
        taken = tcsetattr(device, TCSANOW, &keys) == 0;
        return taken && tellListener('c');
    }

    void giveBack() {
        if (!taken.exchange(false)) return;
        tellListener('c');
        if (inForeground()) tcsetattr(device, TCSANOW, &former);
    }

    // 'c': it has changed hands; 'e': the end.
    bool tellListener(char what) const { return write(wake[1], &what, 1) == 1; }
};

Keyboard::Terminal*& Keyboard::current() {
    static Terminal* terminal = nullptr;
    return terminal;
}

void Keyboard::giveBack() {
    const std::lock_guard guard(g_lock);
    g_away = true;
    if (current()) current()->giveBack();
}

void Keyboard::take() {
    const std::lock_guard guard(g_lock);
    g_away = false;
    if (current()) current()->take();
}

Keyboard::Keyboard(bool enabled, std::function<void(char)> pressed) : pressed_(std::move(pressed)) {
    if (!enabled) return;
    // A stop comes before the terminal is taken, or finds it to give back.
    const std::lock_guard guard(g_lock);
    terminal_ = std::make_unique<Terminal>();
    try {
        if (terminal_->open()) thread_ = std::thread([this] { listen(); });
    } catch (const std::system_error&) {
        // A job that gets by without a thread for keys needs no keys.
    }
    if (!thread_.joinable()) terminal_.reset();
    current() = terminal_.get();
}

Keyboard::~Keyboard() {
    if (!thread_.joinable()) return;
    {
        const std::lock_guard guard(g_lock);
        current() = nullptr;
    }
    if (terminal_->tellListener('e')) thread_.join();
}

void Keyboard::listen() {
    pollfd watched[] = {{terminal_->wake[0], POLLIN, 0}, {terminal_->device, POLLIN, 0}};
    // In the background a read of the terminal would stop the process.
    for (;;) {
        if (poll(watched, terminal_->taken ? 2 : 1, -1) < 0) {
            if (errno == EINTR) continue;
            return;
        }
        char key = 0;
        if (watched[0].revents & POLLIN) {
            if (read(watched[0].fd, &key, 1) != 1 || key == 'e') return;
        } else if ((watched[1].revents & POLLIN) && terminal_->taken && terminal_->inForeground()) {
            if (read(watched[1].fd, &key, 1) == 1) pressed_(key);
        } else if (watched[1].revents & (POLLHUP | POLLERR)) {
            return;
        }
    }
}
