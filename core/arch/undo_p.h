// What has to be taken back unless a sequence of steps comes to its end, whether it leaves by a result or by
// an exception:
//
//     Undo closing([&] { finish(1); });
//     ... steps that return or throw ...
//     closing.dismiss();
#pragma once

#include <new>
#include <utility>

// It runs while an exception is on its way, often for want of memory, so the action should not take any. If
// it does and gets none, the first exception stays the one that is thrown, and what the action did not reach
// is left to the destructors. Any other exception from it ends the program.
template <class Action>
class Undo {
  public:
    explicit Undo(Action action) : action_(std::move(action)) {}
    ~Undo() {
        if (!armed_) return;
        try {
            action_();
        } catch (const std::bad_alloc&) {
        }
    }
    Undo(const Undo&) = delete;
    Undo& operator=(const Undo&) = delete;
    void dismiss() { armed_ = false; }

  private:
    Action action_;
    bool armed_ = true;
};
