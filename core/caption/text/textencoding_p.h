// The encoding of text that does not state it.
#pragma once

#include <string>
#include <string_view>

struct TextEncoding {
    int encoding = -1;  // of QvText; -1: not known
    std::string name;   // as uchardet has it, "" if it found none
};

// A guess from the bytes alone, the better the more of them there are.
TextEncoding guessEncoding(std::string_view bytes);

// UTF-16 without a mark shows in the zeros of its ASCII characters.
enum class UnitOrder { none, little, big };
UnitOrder utf16Order(std::string_view bytes);
