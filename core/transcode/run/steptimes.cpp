#include "core/transcode/run/steptimes_p.h"

namespace {

constexpr double patience = 60.0;  // seconds
constexpr double longestSteps = 5.0;

}  // namespace

void StepTimes::begin(double now) {
    longest_ = 0;
    start_ = now;
    last_ = now;
}

void StepTimes::step(double now) {
    const double took = now - last_.load(std::memory_order_relaxed);
    last_.store(now, std::memory_order_relaxed);
    if (took > longest_.load(std::memory_order_relaxed)) longest_.store(took, std::memory_order_relaxed);
}

bool StepTimes::stuck(double now) const {
    const double last = last_.load(std::memory_order_relaxed);
    const double idle = last > 0 ? now - last : 0;
    return idle > patience && idle > longestSteps * longest_.load(std::memory_order_relaxed);
}
