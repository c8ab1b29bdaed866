// What an exception says, for code that continues after one of any type.
#pragma once

struct FailureText {
    int code;        // QvStatus::outOfMemory or QvStatus::failed
    char text[512];  // one line, never empty
};

// Of the exception that is being handled; takes no memory.
FailureText qvCurrentFailure() noexcept;
