// What has to be taken back unless a sequence of steps comes to its end, whether it leaves by a result or by
// an exception:
//
//     Undo closing([&] { finish(1); });
//     ... steps that return or throw ...
//     closing.dismiss();
#pragma once

#include <utility>

// `Action` must not throw: it runs while an exception is on its way.
template <class Action>
class Undo {
  public:
    explicit Undo(Action action) : action_(std::move(action)) {}
    ~Undo() {
        if (armed_) action_();
    }
    Undo(const Undo&) = delete;
    Undo& operator=(const Undo&) = delete;
    void dismiss() { armed_ = false; }

  private:
    Action action_;
    bool armed_ = true;
};
