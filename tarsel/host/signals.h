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
    // What a part of a command does on a signal; each may be empty. Exceptions are dropped.
    struct Handlers {
        std::function<void(int)> first;  // on the first signal that stops, with its number
        // On the next one, or on the first if `first` is empty. The process then ends at once: with status 0
        // if this returns that the work was complete, else with that of the signal.
        std::function<bool()> second;
        std::function<void()> report = {};  // on SIGUSR1, as often as it comes
        // Before SIGTSTP (Ctrl-Z) stops the process, and on SIGCONT, also after another signal that stops.
        std::function<void()> suspend = {}, resume = {};
        // The message if the process ends at once before the work is complete. Default: that no output was
        // written, if there is a `second` that ensures it. `file`: the name in the message.
        std::optional<Msg> last = {};
        std::string file = {};
    };

    // Blocks these signals, except ignored ones, in this thread and in those started later. To be made before
    // any other thread.
    Signals();
    ~Signals();
    Signals(const Signals&) = delete;
    Signals& operator=(const Signals&) = delete;

    // As long as it exists, its handlers replace those of an outer Watch.
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

    // To be called when the result has its name: no signal changes the status after that. The first is
    // ignored, so that the last messages are printed; the next one ends the process with status 0.
    void complete();
    static bool isComplete();  // takes no lock

  private:
    static void wait();
    static void stop(int signal);
    static void suspend();
};
