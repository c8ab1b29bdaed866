// The text of an exception of any type, for code that continues after it.
#pragma once

struct FailureText {
    int code;        // QvStatus::outOfMemory or QvStatus::failed
    char text[512];  // one line, never empty
};

// Of the exception that is being handled. Does not allocate.
FailureText qvCurrentFailure() noexcept;
