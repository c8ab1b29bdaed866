// The failures of the tool, as texts to compare.
#pragma once

#include <string>

#include "tarsel/words/failure.h"

// The line with which an action fails; empty if it does not. `exit` is set if it fails.
template <class Action>
std::string refusal(Action action, Exit* exit = nullptr) {
    try {
        action();
    } catch (const Failure& failure) {
        if (exit) *exit = failure.exit();
        return failure.what();
    }
    return "";
}
