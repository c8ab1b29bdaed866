#include "core/document/generictext_p.h"

#include <algorithm>
#include <charconv>
#include <string>
#include <string_view>
#include <vector>

#include "core/value/numbertext_p.h"

namespace {

constexpr std::size_t shortestRun = 3;

// The next token, empty at the end.
std::string_view takeToken(std::string_view& text) {
    text.remove_prefix(std::min(text.find_first_not_of(qvnumber::blanks), text.size()));
    const std::string_view token = text.substr(0, text.find_first_of(qvnumber::blanks));
    text.remove_prefix(token.size());
    return token;
}

bool isCount(std::string_view token) { return token.ends_with('x'); }
long long countOf(std::string_view token) { return std::max(0, qvParseInt32(token)); }

char byteOf(std::string_view token) {
    long long value = 0;
    std::from_chars(token.data(), token.data() + token.size(), value, 16);
    return static_cast<char>(value);
}

void appendByte(std::string& text, unsigned char byte) {
    constexpr char digits[] = "0123456789ABCDEF";
    text += digits[byte >> 4];
    text += digits[byte & 15];
    text += ' ';
}

}  // namespace

// A count is written as one less, as the byte after it is a token of its own.
long long qvGenericLength(std::string_view text) {
    long long length = 0;
    for (auto token = takeToken(text); !token.empty(); token = takeToken(text))
        length += isCount(token) ? countOf(token) - 1 : 1;
    return std::max(length, 0LL);
}

std::string qvGenericText(std::string_view bytes) {
    std::string text;
    for (std::size_t i = 0; i < bytes.size();) {
        const std::size_t end = std::min(bytes.find_first_not_of(bytes[i], i), bytes.size());
        std::size_t count = end - i;
        if (count >= shortestRun) {
            text += std::to_string(count) + "x ";
            count = 1;
        }
        while (count-- > 0) appendByte(text, static_cast<unsigned char>(bytes[i]));
        i = end;
    }
    return text;
}

std::vector<char> qvGenericBytes(std::string_view text, long long length) {
    std::vector<char> bytes;
    bytes.reserve(static_cast<std::size_t>(length));
    const auto room = [&] { return static_cast<long long>(bytes.capacity() - bytes.size()); };
    for (auto token = takeToken(text); !token.empty() && room() > 0; token = takeToken(text)) {
        long long count = 1;
        if (isCount(token)) {
            count = countOf(token);
            token = takeToken(text);
        }
        bytes.insert(bytes.end(), static_cast<std::size_t>(std::min(count, room())), byteOf(token));
    }
    bytes.resize(static_cast<std::size_t>(length));
    return bytes;
}
