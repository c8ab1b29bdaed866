// A line of a message in memory that is there already: for handlers of signals, and for the end of a program
// that has no memory left.
#pragma once

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>

#include "tarsel/words/messages.h"

// What does not fit is left out.
class FixedLine {
  public:
    // "tarsel: WHAT: WHY; REMEDY" of a row. Its placeholders take `values` in turn, as names in quotes if
    // they are {file} or {name}.
    explicit FixedLine(Msg id, std::initializer_list<std::string_view> values = {});
    // With the newline.
    std::string_view text() const { return {text_.data(), length_}; }

  private:
    void add(std::string_view text) {
        const std::size_t count = std::min(text.size(), text_.size() - 1 - length_);
        length_ += text.copy(&text_[length_], count);
    }
    void addName(std::string_view name);

    std::array<char, 6000> text_;
    std::size_t length_ = 0;
};
