// A wait that a signal's handler ends from another thread.
#pragma once

#include <atomic>
#include <span>

#include "tarsel/host/descriptor.h"

class Wake {
  public:
    // Throws Failure.
    Wake();

    // From any thread: this wait and all later ones end at once.
    void stop();
    bool stopped() const { return stopped_; }

    // Until one of the descriptors can be read, `milliseconds` have passed, or stop(). Negative descriptors
    // are none; a negative time has no end.
    void wait(std::span<const int> descriptors, long long milliseconds) const;
    // Milliseconds of a counter that only rises.
    static long long now();

  private:
    Descriptor event_;
    std::atomic<bool> stopped_{false};
};
