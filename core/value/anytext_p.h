// The text that an Any holds: views of it up to its first NUL (empty for other types), the way back, and what
// is made of texts. Any and AnyVector declare the operations for applications.
#pragma once

#include <algorithm>
#include <span>
#include <string_view>
#include <vector>

#include <string.h>

#include "core/arch/qvassert.h"
#include "core/value/any.h"

using QvWideView = std::span<const unsigned short>;

inline std::string_view qvNarrowView(const Any& value) {
    if (!value.isString()) return {};
    return {value.asString(), strnlen(value.asString(), static_cast<std::size_t>(value.size()))};
}

inline QvWideView qvWideView(const Any& value) {
    if (!value.isWString()) return {};
    const unsigned short* text = value.asWString();
    const auto size = static_cast<std::size_t>(value.size());
    return {text, static_cast<std::size_t>(std::find(text, text + size, 0) - text)};
}

inline int qvTextLength(std::size_t length) {
    QV_ASSERT(length < 0x7FFFFFFF);
    return static_cast<int>(length);
}

inline Any qvTextOf(std::string_view text) {
    return text.empty() ? Any("") : Any(text.data(), qvTextLength(text.size()));
}
inline Any qvTextOf(QvWideView text) {
    constexpr unsigned short nothing = 0;
    return text.empty() ? Any(&nothing) : Any(text.data(), qvTextLength(text.size()));
}

// Text as UTF-8 or as UTF-16, as Any::toString and toWString.
Any qvNarrowText(const Any& text);
Any qvWideText(const Any& text);
// Any::substr, replace and strcat.
Any qvTextPart(const Any& text, int start, int end);
Any qvTextReplaced(const Any& text, const Any& find, const Any& with);
Any qvTextAppended(const Any& a, const Any& b);
// AnyVector::split and join.
AnyVector qvTextPieces(const Any& text, const Any& delimiter);
Any qvTextsJoined(const AnyVector& parts, const Any& separator);
