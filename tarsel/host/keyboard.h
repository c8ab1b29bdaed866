// The key "p" on a terminal pauses and resumes a job.
#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <thread>

class Keyboard {
  public:
    // Listens on the controlling terminal if `enabled` and this job is in its foreground. `pressed` runs on
    // a thread of its own.
    Keyboard(bool enabled, std::function<void()> pressed);
    ~Keyboard();
    Keyboard(const Keyboard&) = delete;
    Keyboard& operator=(const Keyboard&) = delete;

  private:
    struct Terminal;
    void listen();

    std::function<void()> pressed_;
    std::unique_ptr<Terminal> terminal_;
    std::thread thread_;
};
