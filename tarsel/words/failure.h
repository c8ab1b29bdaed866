// How a command of the tool fails: an exit status and one line that says what, which file, what to do.
#pragma once

#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

enum class Exit : int {
    done = 0,
    failed = 1,
    usage = 2,
    input = 3,   // can't be opened, or is damaged
    output = 4,  // can't be written
    module = 5,  // a module is missing
    check = 6,   // the result is not what the job asked for
    hangup = 129,
    interrupted = 130,
    terminated = 143,
};

class Failure : public std::runtime_error {
  public:
    Failure(Exit exit, const std::string& line) : std::runtime_error(line), exit_(exit) {}
    Exit exit() const { return exit_; }

  private:
    Exit exit_;
};

// " Did you mean 'a' or 'b'?" for an unknown name with near matches among the known ones, else "".
std::string suggestion(std::string_view unknown, const std::vector<std::string>& known);

// "a, b, c", or with another separator "a|b|c".
std::string joined(const std::vector<std::string>& words, std::string_view separator = ", ");

// What the engine or the system said, as the rest of a line: it begins with a small letter unless with a name
// or an abbreviation, and stays on the line.
std::string inLine(std::string text);

// Whether a terminal acts on a character instead of showing it.
bool isObeyed(char32_t c);

// A file name or text for a message: such characters and stray bytes are escaped, quotes are around it.
std::string inQuotes(std::string_view text);
