// SIGINT, SIGTERM, SIGHUP, SIGUSR1, SIGTSTP and SIGCONT, handled on a thread of their own so that the
// handling is ordinary code.
#pragma once

#include <functional>
#include <optional>
#include <string>
#include <thread>

#include "tarsel/words/failure.h"
#include "tarsel/words/messages.h"

class Signals {
  public:
    // What a part of a command does; each may be empty. What one throws is lost.
    struct Handlers {
        std::function<void(int)> first;  // on the first signal that stops, with its number
        // On the next one, or on the first if `first` is empty. The process then ends at once: with status 0
        // if this answers that the work was complete, else with that of the signal.
        std::function<bool()> second;
        std::function<void()> report = {};  // on SIGUSR1, as often as it comes
        // Before SIGTSTP (Ctrl-Z) stops the process, and on SIGCONT, also after another signal that stops.
        std::function<void()> suspend = {}, resume = {};
        // What is said when the process ends at once before the work is complete; without it that no output
        // was written, if there is a `second` to see to that. `file`: the name in it.
        std::optional<Msg> last = {};
        std::string file = {};
    };

    // Blocks those of them that are not ignored in this thread and those started from now on. Make it before
    // any other thread.
    Signals();
    ~Signals();
    Signals(const Signals&) = delete;
    Signals& operator=(const Signals&) = delete;

    // While it lives, these handlers are in force, in the place of those of a Watch around it.
    class Watch {
      public:
        Watch(Signals& signals, Handlers handlers);
        ~Watch();
        Watch(const Watch&) = delete;
        Watch& operator=(const Watch&) = delete;

      private:
        friend class Signals;
        Handlers handlers_;
        const Watch* outer_;
    };

    // The status of a job that a signal stopped; Exit::done when none came.
    Exit received() const;

    int number() const;  // of the signal; 0 when none came
    // As if the user had typed Ctrl-C.
    static void interrupt();

    // The result has its name, and no signal changes the status any more: the first is ignored, so that what
    // is left to say is said, and the next one ends the process with status 0.
    void complete();
    static bool isComplete();  // takes no lock

  private:
    static void wait();
    static void stop(int signal);
    static void suspend();
};
