// Texts of a bounded length, as logs, errors and exceptions keep them.
#pragma once

#include <cstdarg>
#include <cstddef>
#include <cstring>
#include <string>

#include "core/arch/api.h"
#include "core/arch/cformat.h"

// Length of the longest beginning of `text` with at most `limit` bytes that ends between two characters of
// UTF-8. Bytes that are no UTF-8 are cut at the limit.
inline std::size_t qvCutLength(const char* text, std::size_t limit) {
    const std::size_t length = strnlen(text, limit + 1);
    if (length <= limit) return length;
    auto isContinuation = [&](std::size_t i) { return (static_cast<unsigned char>(text[i]) & 0xC0) == 0x80; };
    for (std::size_t cut = limit; cut > 0 && limit - cut < 4; --cut)
        if (!isContinuation(cut)) return cut;
    return limit;
}

// printf into a buffer on the stack, at most `Limit` characters; numbers ignore the locale. A null format
// gives "".
template <std::size_t Limit>
class QvFormattedText {
  public:
    QV_PRINTF(2, 0) QvFormattedText(const char* format, va_list args) {
        const int length = format ? qv_vformat(text_, sizeof text_, format, args) : 0;
        if (length <= 0) text_[0] = 0;
        text_[qvCutLength(text_, Limit)] = 0;
    }
    const char* text() const { return text_; }

  private:
    char text_[Limit + 4];  // a little more than shows, so that a character cut in two is noticed
};

// A short text made by printf's rules, at most 255 characters.
QV_PRINTF(1, 2) inline std::string qvShortText(const char* format, ...) {
    va_list args;
    va_start(args, format);
    const QvFormattedText<255> formatted(format, args);
    va_end(args);
    return formatted.text();
}
