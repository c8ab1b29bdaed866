// The keys that are typed on a terminal while a job runs.
#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <thread>

class Keyboard {
  public:
    // Listens on the controlling terminal if `enabled` and this job is in its foreground. `pressed` runs on
    // a thread of its own.
    Keyboard(bool enabled, std::function<void(char)> pressed);
    ~Keyboard();
    Keyboard(const Keyboard&) = delete;
    Keyboard& operator=(const Keyboard&) = delete;

    // The terminal is as it was while the process is stopped, and in the background. take() does nothing
    // there, or without an object.
    static void giveBack();
    static void take();

  private:
    struct Terminal;
    void listen();
    static Terminal*& current();

    std::function<void(char)> pressed_;
    std::unique_ptr<Terminal> terminal_;
    std::thread thread_;
};
