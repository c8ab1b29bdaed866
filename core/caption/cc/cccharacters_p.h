// The characters of CEA-608 line 21 captions and their codes, without parity and channel bits.
//
//     basic      0x20 to 0x7F, one byte each, two to a pair
//     special    0x11 0x30 to 0x3F
//     extended   0x12 or 0x13, 0x20 to 0x3F; replaces the basic character before it, which receivers
//                show that don't know the extended one
#pragma once

#include <optional>
#include <string_view>

// As UTF-8. `code` lies in the range above.
std::string_view qvCcBasicCharacter(int code);
std::string_view qvCcSpecialCharacter(int code);
std::string_view qvCcExtendedCharacter(int first, int code);

struct QvCcCode {
    int first = 0;     // 0x11, 0x12 or 0x13; 0 for a basic character
    int code = 0;      // the second byte, or the basic character
    int fallback = 0;  // of an extended one: the basic character to send before it
};

// None for a character that captions can't show.
std::optional<QvCcCode> qvCcCodeOf(char32_t character);
