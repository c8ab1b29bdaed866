// Numbers of stored documents and paths. The locale has no say.
#pragma once

#include <algorithm>
#include <charconv>
#include <limits>
#include <string>
#include <string_view>
#include <system_error>

namespace qvnumber {

constexpr std::string_view blanks = " \t\n\v\f\r";

// What a number starts with, after leading blanks and one "+".
inline std::string_view begin(std::string_view text) {
    text.remove_prefix(std::min(text.find_first_not_of(blanks), text.size()));
    if (text.size() > 1 && text[0] == '+' && text[1] != '-') text.remove_prefix(1);
    return text;
}

// As much of the text as is a number, 0 if nothing is; out of range gives the nearest limit.
template <class T>
T parseInteger(std::string_view text) {
    text = begin(text);
    T value = 0;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), value);
    if (result.ec != std::errc::result_out_of_range) return value;
    return text[0] == '-' ? std::numeric_limits<T>::min() : std::numeric_limits<T>::max();
}

// For a decimal number that no double can hold: true if it is too small (below 1), false if too large.
inline bool isTiny(std::string_view number) {
    const std::size_t mark = std::min(number.find_first_of("eE"), number.size());
    const std::string_view digits = number.substr(0, mark);
    const std::size_t point = std::min(digits.find('.'), digits.size());
    const std::size_t first = digits.find_first_of("123456789");
    const long long exponent = mark == number.size() ? 0 : parseInteger<int>(number.substr(mark + 1));
    return static_cast<long long>(point) - static_cast<long long>(first) + exponent <= 0;
}

}  // namespace qvnumber

inline int qvParseInt32(std::string_view text) { return qvnumber::parseInteger<int>(text); }
inline long long qvParseInt64(std::string_view text) { return qvnumber::parseInteger<long long>(text); }

// Also "inf" and "nan". Beyond the range of a double: infinity, or 0 for what is too small.
inline double qvParseFloat(std::string_view text) {
    text = qvnumber::begin(text);
    double value = 0;
    const auto result = std::from_chars(text.data(), text.data() + text.size(), value);
    if (result.ec != std::errc::result_out_of_range) return value;
    const std::string_view number(text.data(), static_cast<std::size_t>(result.ptr - text.data()));
    const double limit = qvnumber::isTiny(number) ? 0.0 : std::numeric_limits<double>::infinity();
    return text[0] == '-' ? -limit : limit;
}

// Six decimal places.
inline std::string qvFloatText(double value) {
    char buffer[400];
    const auto result = std::to_chars(buffer, buffer + sizeof buffer, value, std::chars_format::fixed, 6);
    return {buffer, result.ptr};
}
