// Wide names, 16-bit units in UTF-16, and the bytes that the file system knows them by.
//
// The byte form is UTF-8. File names are free bytes, though, so a listing in wide text must be able to carry
// any of them: a byte that is not part of valid UTF-8 becomes the lone unit 0xDC00 + byte (0xDC80 to 0xDCFF),
// which no valid UTF-16 holds, and goes back to that byte. Bytes to wide to bytes is the identity for every
// byte string.
//
//     "a\xC3\xA9\xFF"  <->  'a' U+00E9 0xDCFF
//
// Other lone surrogates, which name no character, are written as the three bytes that UTF-8's scheme gives.
#pragma once

#include <cstddef>
#include <string>
#include <string_view>

#include "core/arch/api.h"

using QvWideString = std::basic_string<unsigned short>;

QV_API std::string qv_narrow_name(const unsigned short* units, std::size_t count);
QV_API QvWideString qv_wide_name(std::string_view bytes);
