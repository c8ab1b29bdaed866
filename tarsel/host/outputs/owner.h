// The run that a work folder belongs to, as a file in the folder names it. The process number alone may long
// belong to another process; the start of the process and of the system make it unique on a host.
#pragma once

#include <optional>
#include <string>
#include <string_view>

struct Owner {
    std::string host;
    std::string boot;  // which start of the system; "" if it is not known
    long long pid = 0;
    long long started = -1;  // of the process, in clock ticks from the start of the system; -1 if not known

    enum class State {
        living,
        gone,
        elsewhere,  // of another host, which alone can tell
    };

    static Owner self();
    // "tarsel-owner 1", then a line for each field.
    std::string text() const;
    // Nothing for a text that does not end, or that no version known here has written.
    static std::optional<Owner> parse(std::string_view text);
    State state() const;
};
