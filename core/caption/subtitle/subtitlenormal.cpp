#include "core/caption/subtitle/subtitlenormal_p.h"

#include <algorithm>
#include <charconv>
#include <cstdio>
#include <vector>

#include "core/caption/subtitle/subtitlemarkup_p.h"

namespace {

using View = std::string_view;

bool isDigit(char c) { return c >= '0' && c <= '9'; }

View trimmed(View text) {
    while (!text.empty() && (text.front() == ' ' || text.front() == '\t')) text.remove_prefix(1);
    while (!text.empty() && (text.back() == ' ' || text.back() == '\t')) text.remove_suffix(1);
    return text;
}

// Ended by a line feed, a carriage return, or both in this order; more carriage returns before a line feed
// belong to it.
std::vector<View> linesOf(View text) {
    std::vector<View> lines;
    while (!text.empty()) {
        const std::size_t end = std::min(text.find_first_of("\r\n"), text.size());
        lines.push_back(text.substr(0, end));
        text.remove_prefix(end);
        const std::size_t feed = text.find_first_not_of('\r');
        if (feed != text.npos && feed > 0 && text[feed] == '\n')
            text.remove_prefix(feed + 1);
        else if (!text.empty())
            text.remove_prefix(1);
    }
    return lines;
}

bool take(View& text, View what) {
    if (!text.starts_with(what)) return false;
    text.remove_prefix(what.size());
    return true;
}

bool takeNumber(View& text, std::size_t mostDigits, long long& value) {
    std::size_t digits = 0;
    while (digits < text.size() && isDigit(text[digits])) ++digits;
    if (digits == 0 || digits > mostDigits) return false;
    std::from_chars(text.data(), text.data() + digits, value);
    text.remove_prefix(digits);
    return true;
}

// --- SubRip.

constexpr long long msPerHour = 3600000;
constexpr long long mostMs = 600 * msPerHour;  // more can't be written for the parser

// "h:mm:ss,mmm", "mm:ss.mmm"; the part of a second has any number of digits. In ms.
std::optional<long long> takeClock(View& text, View points) {
    long long fields[3] = {}, count = 0;
    do {
        if (!takeNumber(text, 3, fields[count])) return std::nullopt;
    } while (++count < 3 && take(text, ":"));
    if (count < 2) return std::nullopt;
    const long long seconds =
        count == 3 ? (fields[0] * 60 + fields[1]) * 60 + fields[2] : fields[0] * 60 + fields[1];
    long long ms = 0, unit = 100;
    if (text.size() > 1 && points.find(text[0]) != points.npos && isDigit(text[1])) {
        text.remove_prefix(1);
        for (; !text.empty() && isDigit(text[0]); unit /= 10, text.remove_prefix(1))
            ms += (text[0] - '0') * unit;
    }
    return seconds * 1000 + ms;
}

struct Times {
    long long start, end;  // ms
    bool subViewer;
};

std::optional<Times> readTimes(View line, View points, View arrow) {
    line = trimmed(line);
    const auto start = takeClock(line, points);
    line = trimmed(line);
    if (!start || !take(line, arrow)) return std::nullopt;
    line = trimmed(line);
    const auto end = takeClock(line, points);
    if (!end || *start >= mostMs || *end >= mostMs) return std::nullopt;
    if (!line.empty() && line[0] != ' ' && line[0] != '\t') return std::nullopt;
    return Times{*start, *end, arrow == ","};
}

std::optional<Times> readTimes(View line) {
    for (const View arrow : {"-->", "->"})
        if (const auto times = readTimes(line, ",.", arrow)) return times;
    return readTimes(line, ".", ",");
}

// Was meant to be times.
bool looksLikeTimes(View line) {
    line = trimmed(line);
    return line.find("-->") != line.npos && !line.empty() && (isDigit(line[0]) || line[0] == '-') &&
           line.find(':') != line.npos;
}

bool isNumber(View line) {
    line = trimmed(line);
    return !line.empty() && std::all_of(line.begin(), line.end(), isDigit);
}

struct Entry {
    long long start, end;
    std::string text;  // lines, each with its line feed
};

// Hours beyond 99 have no place; the parser takes any number of milliseconds.
std::string clock(long long ms) {
    const long long hours = std::min(ms / msPerHour, 99LL), rest = ms - hours * msPerHour;
    const long long minutes = std::min(rest / 60000, 59LL);
    char text[96];
    std::snprintf(text, sizeof text, "%02lld:%02lld:%02lld,%03lld", hours, minutes,
                  hours < 99 ? rest / 1000 % 60 : 0, hours < 99 ? rest % 1000 : rest - minutes * 60000);
    return text;
}

void sortByStart(std::vector<Entry>& entries) {
    std::stable_sort(entries.begin(), entries.end(),
                     [](const Entry& a, const Entry& b) { return a.start < b.start; });
}

// --- MicroDVD.

// "{12}"; a missing number is -1.
bool takeFrame(View& line, long long& frame) {
    frame = -1;
    if (!take(line, "{")) return false;
    takeNumber(line, 9, frame);
    return take(line, "}");
}

std::optional<double> rateOf(View text) {
    std::string number(trimmed(text));
    std::replace(number.begin(), number.end(), ',', '.');
    double rate = 0;
    const auto [end, error] = std::from_chars(number.data(), number.data() + number.size(), rate);
    if (error != std::errc() || end != number.data() + number.size() || !(rate >= 1 && rate <= 1000))
        return std::nullopt;
    return rate;
}

}  // namespace

NormalText normalSrt(View text) {
    NormalText out;
    std::vector<Entry> entries;
    const auto lines = linesOf(text);
    bool open = false, subViewer = false;
    for (std::size_t i = 0; i < lines.size(); ++i) {
        if (const auto times = readTimes(lines[i])) {
            entries.push_back({times->start, times->end, ""});
            open = true;
            subViewer = times->subViewer;
            continue;
        }
        const bool before = i + 1 < lines.size() && (readTimes(lines[i + 1]) || looksLikeTimes(lines[i + 1]));
        if (looksLikeTimes(lines[i])) {
            ++out.lost;
            open = false;
        }
        if (!open || trimmed(lines[i]).empty() || (before && isNumber(lines[i]))) continue;
        const std::string shown = withSimpleMarkup(lines[i], subViewer);
        // A break at the end of a line makes an empty one, at which the parser would end the entry.
        for (const View line : linesOf(shown))
            if (!trimmed(line).empty()) entries.back().text += std::string(line) + "\n";
    }
    sortByStart(entries);
    for (const Entry& entry : entries)
        out.text += std::to_string(++out.entries) + "\n" + clock(entry.start) + " --> " + clock(entry.end) +
                    "\n" + entry.text + "\n";
    return out;
}

NormalText normalSub(View text) {
    NormalText out;
    std::vector<Entry> entries;
    bool first = true;
    for (View line : linesOf(text)) {
        line = trimmed(line);
        const bool begins = line.size() > 1 && line[0] == '{' && isDigit(line[1]);
        Entry entry{};
        if (!takeFrame(line, entry.start) || !takeFrame(line, entry.end) || entry.start < 0) {
            out.lost += begins;
            continue;
        }
        if (first && entry.start <= 1 && entry.end <= 1) out.rate = rateOf(line);
        if (!first || !out.rate) entries.push_back({entry.start, entry.end, withControlCodes(line)});
        first = false;
    }
    sortByStart(entries);
    for (std::size_t i = 0; i < entries.size(); ++i) {
        const Entry& entry = entries[i];
        // Without an end it is shown until the next one, the last for a hundred frames.
        const long long next = i + 1 < entries.size() ? entries[i + 1].start - 1 : entry.start + 100;
        const long long end = entry.end >= 0 ? entry.end : std::max(next, entry.start);
        out.text += "{" + std::to_string(entry.start) + "}{" + std::to_string(end) + "}" + entry.text + "\n";
    }
    out.entries = static_cast<int>(entries.size());
    return out;
}
