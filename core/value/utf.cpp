#include "core/value/utf.h"

namespace {

constexpr bool isHigh(unsigned unit) { return (unit & 0xFC00) == 0xD800; }
constexpr bool isLow(unsigned unit) { return (unit & 0xFC00) == 0xDC00; }
constexpr bool isScalar(char32_t c) { return c < 0xD800 || (c >= 0xE000 && c <= 0x10FFFF); }

// What a lead byte promises: the number of bytes that follow, and the range of the first of them, which rules
// out overlong forms, surrogates and values above U+10FFFF.
struct Lead {
    int following;
    unsigned char low;
    unsigned char high;
};

constexpr Lead leadOf(unsigned char byte) {
    if (byte < 0xC2 || byte > 0xF4) return {0, 0, 0};
    if (byte < 0xE0) return {1, 0x80, 0xBF};
    if (byte == 0xE0) return {2, 0xA0, 0xBF};
    if (byte == 0xED) return {2, 0x80, 0x9F};
    if (byte < 0xF0) return {2, 0x80, 0xBF};
    if (byte == 0xF0) return {3, 0x90, 0xBF};
    if (byte == 0xF4) return {3, 0x80, 0x8F};
    return {3, 0x80, 0xBF};
}

// Reads the character. False: it was ill-formed.
bool decode(std::string_view text, std::size_t& position, char32_t& character) {
    const auto first = static_cast<unsigned char>(text[position++]);
    character = first;
    if (first < 0x80) return true;
    const Lead lead = leadOf(first);
    if (lead.following == 0) return false;
    character = first & (0x3Fu >> lead.following);
    for (int i = 0; i < lead.following; ++i) {
        if (position == text.size()) return false;
        const auto byte = static_cast<unsigned char>(text[position]);
        if (byte < (i == 0 ? lead.low : 0x80) || byte > (i == 0 ? lead.high : 0xBF)) return false;
        character = character << 6 | (byte & 0x3Fu);
        ++position;
    }
    return true;
}

}  // namespace

namespace QvUtf {

char32_t next(std::string_view text, std::size_t& position) {
    char32_t character = 0;
    return decode(text, position, character) ? character : replacement;
}

char32_t next(std::span<const unsigned short> text, std::size_t& position) {
    const unsigned unit = text[position++];
    if (isHigh(unit) && position < text.size() && isLow(text[position]))
        return 0x10000u + ((unit & 0x3FFu) << 10) + (text[position++] & 0x3FFu);
    return isHigh(unit) || isLow(unit) ? replacement : unit;
}

void append(std::string& text, char32_t c) {
    if (!isScalar(c)) c = replacement;
    const auto put = [&](char32_t byte) { text.push_back(static_cast<char>(byte)); };
    if (c < 0x80) return put(c);
    if (c < 0x800) {
        put(0xC0 | c >> 6);
    } else {
        if (c < 0x10000) {
            put(0xE0 | c >> 12);
        } else {
            put(0xF0 | c >> 18);
            put(0x80 | (c >> 12 & 0x3F));
        }
        put(0x80 | (c >> 6 & 0x3F));
    }
    put(0x80 | (c & 0x3F));
}

void append(std::vector<unsigned short>& text, char32_t c) {
    if (!isScalar(c)) c = replacement;
    if (c < 0x10000) return text.push_back(static_cast<unsigned short>(c));
    text.push_back(static_cast<unsigned short>(0xD800 + ((c - 0x10000) >> 10)));
    text.push_back(static_cast<unsigned short>(0xDC00 + (c & 0x3FF)));
}

std::string toUtf8(std::span<const unsigned short> text) {
    std::string result;
    result.reserve(text.size());
    for (std::size_t position = 0; position < text.size();) append(result, next(text, position));
    return result;
}

std::vector<unsigned short> toUtf16(std::string_view text) {
    std::vector<unsigned short> result;
    result.reserve(text.size());
    for (std::size_t position = 0; position < text.size();) append(result, next(text, position));
    return result;
}

bool isValid(std::string_view text) {
    char32_t ignored = 0;
    for (std::size_t position = 0; position < text.size();)
        if (!decode(text, position, ignored)) return false;
    return true;
}

}  // namespace QvUtf
