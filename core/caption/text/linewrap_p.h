// Where a line of text that is too wide is broken.
#pragma once

#include <cstddef>
#include <span>
#include <string_view>
#include <vector>

// A stretch of characters, without the blanks at its ends.
struct LinePart {
    std::size_t begin;
    std::size_t end;
};

// Breaks a text, whose characters have these advances, into as few parts of at most `widest` as can be, with
// their widths as even as can be. It breaks where its script allows it, and between any two letters of a word
// that is wider than a line. Empty parts are left out.
std::vector<LinePart> wrapLine(std::u32string_view text, std::span<const long long> advances,
                               long long widest);
