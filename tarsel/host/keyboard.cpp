#include "tarsel/host/keyboard.h"

#include <system_error>

#include <fcntl.h>
#include <poll.h>
#include <termios.h>
#include <unistd.h>

// Keys arrive one by one while the object lives; then the terminal is as it was.
struct Keyboard::Terminal {
    int device = -1;
    int wake[2] = {-1, -1};
    termios former{};

    ~Terminal() {
        if (device < 0) return;
        tcsetattr(device, TCSANOW, &former);
        for (int fd : {device, wake[0], wake[1]})
            if (fd >= 0) close(fd);
    }

    bool open() {
        device = ::open("/dev/tty", O_RDONLY | O_CLOEXEC | O_NOCTTY);
        if (device < 0) return false;
        if (tcgetpgrp(device) != getpgrp() || tcgetattr(device, &former) != 0 ||
            pipe2(wake, O_CLOEXEC) != 0) {
            close(device);
            device = -1;
            return false;
        }
        termios keys = former;
        keys.c_lflag &= ~static_cast<tcflag_t>(ICANON | ECHO);
        tcsetattr(device, TCSANOW, &keys);
        return true;
    }
};

Keyboard::Keyboard(bool enabled, std::function<void()> pressed) : pressed_(std::move(pressed)) {
    if (!enabled) return;
    terminal_ = std::make_unique<Terminal>();
    try {
        if (terminal_->open()) thread_ = std::thread([this] { listen(); });
    } catch (const std::system_error&) {
        // A job that gets by without a thread for keys needs no keys.
    }
    if (!thread_.joinable()) terminal_.reset();
}

Keyboard::~Keyboard() {
    if (!thread_.joinable()) return;
    const char end = 0;
    if (write(terminal_->wake[1], &end, 1) == 1) thread_.join();
}

void Keyboard::listen() {
    pollfd watched[] = {{terminal_->device, POLLIN, 0}, {terminal_->wake[0], POLLIN, 0}};
    while (poll(watched, 2, -1) >= 0 && !(watched[1].revents & POLLIN)) {
        char key = 0;
        if ((watched[0].revents & POLLIN) && read(terminal_->device, &key, 1) == 1 && key == 'p') pressed_();
        if (watched[0].revents & (POLLHUP | POLLERR)) return;
    }
}
