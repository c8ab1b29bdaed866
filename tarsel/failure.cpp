#include "failure.h"

#include <algorithm>
#include <cstdio>
#include <numeric>

namespace {

// Levenshtein distance, ignoring nothing: names are short.
size_t distance(std::string_view a, std::string_view b) {
    std::vector<size_t> row(b.size() + 1);
    std::iota(row.begin(), row.end(), size_t{0});
    for (size_t i = 1; i <= a.size(); ++i) {
        size_t diagonal = row[0];
        row[0] = i;
        for (size_t j = 1; j <= b.size(); ++j) {
            const size_t above = row[j];
            row[j] = std::min({above + 1, row[j - 1] + 1, diagonal + (a[i - 1] != b[j - 1])});
            diagonal = above;
        }
    }
    return row[b.size()];
}

}  // namespace

std::string suggestion(std::string_view unknown, const std::vector<std::string>& known) {
    std::vector<std::pair<size_t, std::string>> near;
    for (const auto& name : known) {
        const size_t d = distance(unknown, name);
        const bool begins = unknown.size() >= 3 && name.rfind(unknown, 0) == 0;
        if (begins || d <= std::max<size_t>(1, unknown.size() / 3)) near.emplace_back(begins ? 0 : d, name);
    }
    std::sort(near.begin(), near.end());
    if (near.empty()) return "";
    std::string text = " Did you mean '" + near[0].second + "'";
    if (near.size() > 1) text += " or '" + near[1].second + "'";
    return text + "?";
}

std::string inLine(std::string text) {
    std::replace(text.begin(), text.end(), '\n', ' ');
    // A log line's "[part of the engine] ".
    if (const size_t end = text.find("] "); text[0] == '[' && end != std::string::npos)
        text.erase(0, end + 2);
    while (!text.empty() && (text.back() == ' ' || text.back() == '.')) text.pop_back();
    const auto isSmall = [](char c) { return c == ' ' || (c >= 'a' && c <= 'z'); };
    if (text.size() > 1 && text[0] >= 'A' && text[0] <= 'Z' && isSmall(text[1]))
        text[0] = static_cast<char>(text[0] + ('a' - 'A'));
    return text;
}

std::string inQuotes(std::string_view text) {
    std::string out = "'";
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (byte < 0x20 || byte == 0x7F) {
            char escape[8];
            std::snprintf(escape, sizeof escape, "\\x%02x", byte);
            out += escape;
        } else {
            out += c;
        }
    }
    return out + "'";
}
