// What has happened, in order, as one line of words.
#pragma once

#include <condition_variable>
#include <mutex>
#include <string>
#include <utility>

class Events {
  public:
    void add(const std::string& text) {
        const std::lock_guard guard(lock_);
        all_ += (all_.empty() ? "" : " ") + text;
        changed_.notify_all();
    }
    std::string all() const {
        const std::lock_guard guard(lock_);
        return all_;
    }
    std::string take() {
        const std::lock_guard guard(lock_);
        return std::exchange(all_, "");
    }
    void waitFor(const std::string& text) {
        std::unique_lock guard(lock_);
        changed_.wait(guard, [&] { return all_.find(text) != std::string::npos; });
    }

  private:
    mutable std::mutex lock_;
    std::condition_variable changed_;
    std::string all_;
};
