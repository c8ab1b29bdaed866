// Conversions of text between the encodings that subtitles come in.
//
//     std::u32string line = QvText::toUtf32(bytes, 1256);   // bounded, for text of any origin
//
// Bad input never fails: what is ill-formed becomes U+FFFD, see core/value/utf.h. UTF-16 and UTF-32 are
// taken in this machine's byte order.
#pragma once

#include <string>
#include <string_view>

#include "core/arch/api.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

class QV_API QvText {
  public:
    // An encoding is one of these, or else the number of a code page, as 1252.
    enum Encoding : int { bytes = 0, utf8 = 1, utf16 = 2, utf32 = 3 };

    // --- Bounded forms: they read `text` up to its end or its first zero, whichever comes first.

    // bytes: each byte is a code point. An odd rest of UTF-16 or UTF-32 is passed over. Of a code page that
    // the system does not know, the ASCII characters are read and all others are U+FFFD.
    static std::u32string toUtf32(std::string_view text, int encoding);
    static std::string toUtf8(std::u32string_view text);

    // --- Zero-terminated buffers. The target must not overlap the source, is terminated too, and has room
    // for the longest result: a unit for each unit (or byte) of the source, for utf32ToUtf8 four bytes, and
    // the terminator. The result is the number of units written before it.
    static int utf8ToUtf32(const char* text, unsigned* out);
    static int utf16ToUtf32(const unsigned short* text, unsigned* out);
    static int utf32ToUtf8(const unsigned* text, char* out);
    // Of UTF-16 and UTF-32 the terminator is a zero unit. Any alignment will do.
    static int encodingToUtf32(const char* text, int encoding, unsigned* out);

    // --- String and WString. 0, or -1 with `out` invalid if `text` is no text. Narrow text is UTF-8 on
    // every door of the engine, so the two pairs do the same.
    static int utf8ToWchar(const Any& text, Any& out);
    static int wcharToUtf8(const Any& text, Any& out);
    static int stringToWchar(const Any& text, Any& out) { return utf8ToWchar(text, out); }
    static int wcharToString(const Any& text, Any& out) { return wcharToUtf8(text, out); }

    // --- What a user can choose from.

    // Replaces `out` by Dicts of "name" (String) and "identifier" (Int32): UTF-32, UTF-16, UTF-8, ASCII, and
    // the code pages of this system in rising order.
    static void availableEncodings(AnyVector& out);
    static Any encodingName(int identifier);  // "N/A" if this system has none of that number

    // Whether text can be drawn with a file: one that the font library reads.
    static bool isFont(const Any& file);

    // `text` as one word of a command line, in which no character can act. Invalid if it is no text.
    static Any cliEscape(const Any& text);
};
