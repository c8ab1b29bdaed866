#include "tarsel/host/signals.h"

#include <atomic>
#include <mutex>
#include <system_error>

#include <pthread.h>
#include <signal.h>
#include <unistd.h>

#include "tarsel/host/events.h"
#include "tarsel/host/keyboard.h"
#include "tarsel/words/fixedline.h"

namespace {

std::atomic<int> g_received{0};
std::mutex g_lock;                            // held while a handler runs
const Signals::Watch* g_innermost = nullptr;  // guarded by g_lock
std::atomic<bool> g_complete{false};

sigset_t handledSignals() {
    sigset_t set;
    sigemptyset(&set);
    for (int number : {SIGINT, SIGTERM, SIGHUP, SIGUSR1, SIGTSTP, SIGCONT}) {
        struct sigaction action {};
        // What the caller ignores, as nohup does, stays ignored.
        if (sigaction(number, nullptr, &action) == 0 && action.sa_handler != SIG_IGN) sigaddset(&set, number);
    }
    return set;
}

Exit statusOf(int signal) {
    return signal == SIGTERM ? Exit::terminated : signal == SIGHUP ? Exit::hangup : Exit::interrupted;
}

// Of an exception there is nobody to tell, and the thread has to stay.
template <class Handler>
bool succeeds(Handler handler) {
    try {
        handler();
        return true;
    } catch (...) {
        return false;
    }
}

}  // namespace

// Runs for the life of the process, so it is detached: a signal may come until the very end.
void Signals::wait() {
    const sigset_t set = handledSignals();
    for (int signal = 0;;) {
        if (sigwait(&set, &signal) != 0) continue;
        std::lock_guard guard(g_lock);
        const Handlers none;
        const Handlers& now = g_innermost ? g_innermost->handlers_ : none;
        const auto call = [](const std::function<void()>& handler) {
            if (handler) succeeds(handler);
        };
        switch (signal) {
            case SIGUSR1: call(now.report); break;
            case SIGTSTP:
                call(now.suspend);
                Keyboard::giveBack();
                suspend();
                [[fallthrough]];  // it was continued, or could not be stopped
            case SIGCONT:
                call(now.resume);
                Keyboard::take();
                break;
            default: stop(signal);
        }
    }
}

// By the default action, which is none where no shell could continue the process.
void Signals::suspend() {
    sigset_t stops;
    sigemptyset(&stops);
    sigaddset(&stops, SIGTSTP);
    pthread_sigmask(SIG_UNBLOCK, &stops, nullptr);
    raise(SIGTSTP);
    pthread_sigmask(SIG_BLOCK, &stops, nullptr);
}

void Signals::interrupt() {
    struct sigaction action {};
    const bool ignored = sigaction(SIGINT, nullptr, &action) == 0 && action.sa_handler == SIG_IGN;
    kill(getpid(), ignored ? SIGTERM : SIGINT);
}

void Signals::stop(int signal) {
    const bool again = g_received.exchange(signal) != 0;
    Events::get().hurry();
    const Handlers none;
    const Handlers& now = g_innermost ? g_innermost->handlers_ : none;
    if (g_complete && !again) return;
    if (!again && now.first && succeeds([&] { now.first(signal); })) return;
    bool complete = g_complete;
    if (!complete && now.second) succeeds([&] { complete = now.second(); });
    const int status = static_cast<int>(complete ? Exit::done : statusOf(signal));
    const Msg last = now.last.value_or(now.second ? Msg::stoppedWithNothing : Msg::stopped);
    lastWords(complete ? std::string_view() : FixedLine(last, {now.file}).text(), status);
    _exit(status);
}

Signals::Signals() {
    const sigset_t set = handledSignals();
    pthread_sigmask(SIG_BLOCK, &set, nullptr);
    // A closed pipe and a file that may not grow are errors of the write.
    signal(SIGPIPE, SIG_IGN);
    signal(SIGXFSZ, SIG_IGN);
    try {
        std::thread(wait).detach();
    } catch (const std::system_error&) {
        throw failure(Msg::toolHasNoThread);
    }
}

Signals::~Signals() {
    std::lock_guard guard(g_lock);
    g_innermost = nullptr;
}

Signals::Watch::Watch(Signals&, Handlers handlers) : handlers_(std::move(handlers)) {
    std::lock_guard guard(g_lock);
    outer_ = g_innermost;
    g_innermost = this;
}

Signals::Watch::~Watch() {
    std::lock_guard guard(g_lock);
    g_innermost = outer_;
}

Exit Signals::received() const {
    const int signal = g_received.load();
    return signal == 0 ? Exit::done : statusOf(signal);
}

int Signals::number() const { return g_received; }

void Signals::complete() {
    std::lock_guard guard(g_lock);
    g_complete = true;
}

bool Signals::isComplete() { return g_complete; }
