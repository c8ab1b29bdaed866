#include "tarsel/host/signals.h"

#include <atomic>
#include <mutex>

#include <pthread.h>
#include <signal.h>
#include <unistd.h>

namespace {

std::atomic<int> g_received{0};
std::mutex g_lock;
std::function<void()> g_first, g_second;

sigset_t stopSignals() {
    sigset_t set;
    sigemptyset(&set);
    for (int number : {SIGINT, SIGTERM, SIGHUP}) {
        struct sigaction action {};
        // What the caller ignores, as nohup does, stays ignored.
        if (sigaction(number, nullptr, &action) == 0 && action.sa_handler != SIG_IGN) sigaddset(&set, number);
    }
    return set;
}

Exit statusOf(int signal) {
    return signal == SIGTERM ? Exit::terminated : signal == SIGHUP ? Exit::hangup : Exit::interrupted;
}

// Runs for the life of the process, so it is detached: a signal may come until the very end.
void waitForSignals() {
    const sigset_t set = stopSignals();
    for (int signal = 0;;) {
        if (sigwait(&set, &signal) != 0) continue;
        const int earlier = g_received.exchange(signal);
        std::lock_guard guard(g_lock);
        if (earlier != 0 || !g_first) {
            if (g_second) g_second();
            _exit(static_cast<int>(statusOf(signal)));
        }
        g_first();
    }
}

}  // namespace

Signals::Signals() {
    const sigset_t set = stopSignals();
    pthread_sigmask(SIG_BLOCK, &set, nullptr);
    // A closed pipe and a file that may not grow are errors of the write.
    signal(SIGPIPE, SIG_IGN);
    signal(SIGXFSZ, SIG_IGN);
    std::thread(waitForSignals).detach();
}

Signals::~Signals() { watch(nullptr, nullptr); }

void Signals::watch(std::function<void()> first, std::function<void()> second) {
    std::lock_guard guard(g_lock);
    g_first = std::move(first);
    g_second = std::move(second);
}

Exit Signals::received() const {
    const int signal = g_received.load();
    return signal == 0 ? Exit::done : statusOf(signal);
}
