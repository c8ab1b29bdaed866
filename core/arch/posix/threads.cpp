#include <sched.h>
#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <system_error>

#include "core/arch/platform.h"

std::thread QvPlatform::startThread(std::function<void()> body) {
    try {
        return std::thread(std::move(body));
    } catch (const std::exception&) {  // no thread, or no memory for one
        return {};
    }
}

// SCHED_BATCH is what any user may enter and leave again; a raised nice value could not be lowered back.
int QvPlatform::lowerThreadPriority() {
    const int former = sched_getscheduler(0);
    const sched_param none{};
    if (former == SCHED_OTHER) sched_setscheduler(0, SCHED_BATCH, &none);
    return former;
}

void QvPlatform::restoreThreadPriority(int former) {
    const sched_param none{};
    if (former == SCHED_OTHER) sched_setscheduler(0, SCHED_OTHER, &none);
}

void QvPlatform::sleep(int milliseconds) {
    if (milliseconds > 0)
        std::this_thread::sleep_for(std::chrono::milliseconds(milliseconds));
    else
        std::this_thread::yield();
}

int QvPlatform::processors() {
    cpu_set_t usable;
    if (sched_getaffinity(0, sizeof usable, &usable) == 0) return std::max(1, CPU_COUNT(&usable));
    return std::max(1, static_cast<int>(std::thread::hardware_concurrency()));
}

namespace {
template <class Clock>
long long nanoseconds() {
    return std::chrono::duration_cast<std::chrono::nanoseconds>(Clock::now().time_since_epoch()).count();
}
}  // namespace

long long QvPlatform::steadyNs() { return nanoseconds<std::chrono::steady_clock>(); }

long long QvPlatform::systemNs() { return nanoseconds<std::chrono::system_clock>(); }

bool QvPlatform::localTime(long long seconds, std::tm& calendar) {
    const auto moment = static_cast<std::time_t>(seconds);
    return localtime_r(&moment, &calendar) != nullptr;
}

void* QvPlatform::allocate(std::size_t bytes, std::size_t alignment) {
    alignment = std::max(alignment, sizeof(void*));
    const std::size_t rounded = (bytes + alignment - 1) & ~(alignment - 1);
    if (rounded < bytes) return nullptr;
    return std::aligned_alloc(alignment, std::max(rounded, alignment));
}

void QvPlatform::release(void* block) { std::free(block); }
