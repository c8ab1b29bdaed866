#include "tarsel/words/failure.h"

#include <algorithm>
#include <cstdio>

#include <qvplugcore/qvplugcore.h>

namespace {

// How many letters are missing, too many, wrong, or, as a pair, the wrong way round.
size_t distance(std::string_view a, std::string_view b) {
    std::vector<std::vector<size_t>> d(a.size() + 1, std::vector<size_t>(b.size() + 1));
    for (size_t i = 0; i <= a.size(); ++i)
        for (size_t j = 0; j <= b.size(); ++j) {
            if (i == 0 || j == 0) {
                d[i][j] = i + j;
                continue;
            }
            const size_t wrong = a[i - 1] != b[j - 1];
            d[i][j] = std::min({d[i - 1][j] + 1, d[i][j - 1] + 1, d[i - 1][j - 1] + wrong});
            if (i > 1 && j > 1 && a[i - 1] == b[j - 2] && a[i - 2] == b[j - 1])
                d[i][j] = std::min(d[i][j], d[i - 2][j - 2] + 1);
        }
    return d[a.size()][b.size()];
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

std::string joined(const std::vector<std::string>& words, std::string_view separator) {
    std::string text;
    for (const auto& word : words) {
        if (!text.empty()) text += separator;
        text += word;
    }
    return text;
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

bool isObeyed(char32_t c) {
    const auto isIn = [c](char32_t first, char32_t last) { return c >= first && c <= last; };
    // Controls, line and paragraph ends with the overrides of the direction, and its isolates.
    return isIn(0, 0x1F) || isIn(0x7F, 0x9F) || isIn(0x2028, 0x202E) || isIn(0x2066, 0x2069);
}

std::string inQuotes(std::string_view text) {
    std::string out = "'";
    for (size_t at = 0; at < text.size();) {
        const size_t start = at;
        const char32_t character = QvUtf::next(text, at);
        const std::string_view bytes = text.substr(start, at - start);
        const bool stray = character == QvUtf::replacement && bytes != "\xEF\xBF\xBD";
        if (!stray && !isObeyed(character)) {
            out += bytes;
            continue;
        }
        for (const char c : bytes) {
            char escape[8];
            std::snprintf(escape, sizeof escape, "\\x%02x", static_cast<unsigned char>(c));
            out += escape;
        }
    }
    return out + "'";
}
