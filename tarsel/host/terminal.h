// The terminal that the standard error may be, and the end of the process.
#pragma once

#include <string_view>

bool stderrIsTerminal();
bool colourWanted();    // false if NO_COLOR is set to anything
int terminalColumns();  // of the standard error; 0 if it has no width

// Whether a write of up to 4096 bytes would not wait. Without memory or locks.
bool stderrHasRoom();
// Without memory or locks. False if it could not be written.
bool writeToStderr(std::string_view text);
// At once: no destructor and no exit handler runs.
[[noreturn]] void leave(int status);

// While it lives, what is written to the standard error vanishes.
class QuietStderr {
  public:
    explicit QuietStderr(bool on);
    ~QuietStderr();
    QuietStderr(const QuietStderr&) = delete;
    QuietStderr& operator=(const QuietStderr&) = delete;

  private:
    int saved_ = -1;  // a descriptor, negative if nothing was changed
};
