// Conversion between UTF-8 and the 16-bit units (UTF-16) of wide text.
//
// Bad input never fails: each ill-formed UTF-8 sequence (its longest well-formed start) and each unpaired
// surrogate becomes U+FFFD. Zero is a character like any other.
#pragma once

#include <cstddef>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "core/arch/api.h"

namespace QvUtf {

constexpr char32_t replacement = 0xFFFD;

// Decodes the character at `position`, which must lie inside the text, and moves `position` past it.
QV_API char32_t next(std::string_view text, std::size_t& position);
QV_API char32_t next(std::span<const unsigned short> text, std::size_t& position);

// Appends a character; one that is no Unicode scalar value goes in as U+FFFD.
QV_API void append(std::string& text, char32_t character);
QV_API void append(std::vector<unsigned short>& text, char32_t character);

QV_API std::string toUtf8(std::span<const unsigned short> text);
QV_API std::vector<unsigned short> toUtf16(std::string_view text);

// True for text that is well-formed UTF-8.
QV_API bool isValid(std::string_view text);

}  // namespace QvUtf
