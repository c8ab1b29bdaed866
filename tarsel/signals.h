// SIGINT and SIGTERM, handled on a thread of their own so that the handling is ordinary code.
#pragma once

#include <functional>
#include <thread>

#include "failure.h"

class Signals {
  public:
    // Blocks both signals in this thread and those started from now on. `first` runs on the first signal;
    // `second` on the next one, after which the process ends at once. Make it before any other thread.
    Signals();
    ~Signals();
    Signals(const Signals&) = delete;
    Signals& operator=(const Signals&) = delete;

    void watch(std::function<void()> first, std::function<void()> second);
    void unwatch();

    // The status of a job that a signal stopped; Exit::done when none came.
    Exit received() const;
};
