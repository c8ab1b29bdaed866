#include "tarsel/host/follow/wake.h"

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <climits>
#include <vector>

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include "tarsel/words/messages.h"
#include "tarsel/words/systemcause.h"

Wake::Wake() : event_(::eventfd(0, EFD_NONBLOCK | EFD_CLOEXEC)) {
    if (event_) return;
    const SystemCause cause = causeOf(errno);
    throw failure(Msg::systemFailed, {cause.why, cause.remedy});
}

void Wake::stop() {
    stopped_ = true;
    const unsigned long long one = 1;
    // A counter that is full wakes as well.
    [[maybe_unused]] const ssize_t written = ::write(event_.get(), &one, sizeof one);
}

void Wake::wait(std::span<const int> descriptors, long long milliseconds) const {
    std::vector<pollfd> all = {{event_.get(), POLLIN, 0}};
    for (const int descriptor : descriptors) all.push_back({descriptor, POLLIN, 0});
    const int time = milliseconds < 0 ? -1 : static_cast<int>(std::min<long long>(milliseconds, INT_MAX));
    ::poll(all.data(), all.size(), time);  // one that ends early is only a wait that ends early
}

long long Wake::now() {
    using namespace std::chrono;
    return duration_cast<milliseconds>(steady_clock::now().time_since_epoch()).count();
}
