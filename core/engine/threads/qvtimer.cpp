#include "core/engine/threads/qvtimer.h"

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "core/arch/platform.h"

struct QvTimer::Counter {
    long long frequency = 1'000'000'000;  // counts a second
    long long start = 0;
};

QvTimer::QvTimer() : counter_(std::make_unique<Counter>()) { start(); }
QvTimer::~QvTimer() = default;

void QvTimer::start() { counter_->start = qv_platform().steadyNs(); }

double QvTimer::stop() {
    return static_cast<double>(qv_platform().steadyNs() - counter_->start) /
           static_cast<double>(counter_->frequency);
}

double QvTimer::absoluteTime() { return static_cast<double>(qv_platform().steadyNs()) * 1e-9; }

double QvTimer::time() {
    const auto milliseconds = [] { return qv_platform().steadyNs() / 1'000'000; };
    static const long long origin = milliseconds();
    return static_cast<double>(milliseconds() - origin) / 1000.0;
}

namespace {

constexpr double longest = 1e11;  // seconds; keeps the minutes within 32 bits and the text within its buffer

long long toMilliseconds(double seconds) {
    if (std::isnan(seconds)) return 0;
    return std::llround(std::clamp(seconds, -longest, longest) * 1000.0);
}

}  // namespace

void QvTimer::strtime(char* buffer, double seconds, unsigned format) {
    const long long total = toMilliseconds(seconds);
    const char* const sign = total < 0 ? "-" : "";
    const long long positive = std::abs(total);
    const int ms = static_cast<int>(positive % 1000);
    const int s = static_cast<int>(positive / 1000 % 60);
    const int minutes = static_cast<int>(positive / 60'000);
    if (format == sm)
        std::snprintf(buffer, strtimeSize, "%s%lld.%03d", sign, positive / 1000, ms);
    else if (format == msm)
        std::snprintf(buffer, strtimeSize, "%s%d:%02d.%03d", sign, minutes, s, ms);
    else if (format == hmsm)
        std::snprintf(buffer, strtimeSize, "%s%d:%02d:%02d.%03d", sign, minutes / 60, minutes % 60, s, ms);
}
