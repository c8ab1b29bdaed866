// SIGINT, SIGTERM and SIGHUP, handled on a thread of their own so that the handling is ordinary code.
#pragma once

#include <functional>
#include <thread>

#include "tarsel/words/failure.h"

class Signals {
  public:
    // Blocks those of them that are not ignored in this thread and those started from now on. `first` runs on
    // the first signal; `second` on the next one, after which the process ends at once. Make it before any
    // other thread.
    Signals();
    ~Signals();
    Signals(const Signals&) = delete;
    Signals& operator=(const Signals&) = delete;

    // While it lives, these run.
    class Watch {
      public:
        Watch(Signals& signals, std::function<void()> first, std::function<void()> second)
            : signals_(signals) {
            signals_.watch(std::move(first), std::move(second));
        }
        ~Watch() { signals_.watch(nullptr, nullptr); }
        Watch(const Watch&) = delete;
        Watch& operator=(const Watch&) = delete;

      private:
        Signals& signals_;
    };

    // The status of a job that a signal stopped; Exit::done when none came.
    Exit received() const;

  private:
    void watch(std::function<void()> first, std::function<void()> second);
};
