// How long the steps of a run take, for a supervisor on another thread, which reads without a lock. Times are
// those of QvTimer::time, in seconds.
#pragma once

#include <atomic>

class StepTimes {
  public:
    void begin(double now);
    void step(double now);  // one has ended
    double start() const { return start_.load(std::memory_order_relaxed); }
    // No step has ended for over 60 s and five times the longest one: hung, and not only slow.
    bool stuck(double now) const;

  private:
    std::atomic<double> start_{0}, last_{0}, longest_{0};
};
