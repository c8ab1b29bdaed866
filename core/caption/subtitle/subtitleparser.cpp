#include "core/caption/subtitle/subtitleparser_p.h"

#include <algorithm>
#include <charconv>
#include <climits>
#include <optional>

#include "core/engine/status.h"

namespace {

using View = std::string_view;

// As atoi, for any text: blanks, a sign, digits, and whatever follows. Beyond the range the nearest limit.
int number(View text) {
    text.remove_prefix(std::min(text.find_first_not_of(" \t\v\f\r\n"), text.size()));
    const bool minus = text.starts_with('-');
    if (minus || text.starts_with('+')) text.remove_prefix(1);
    if (text.empty() || text.front() < '0' || text.front() > '9') return 0;
    long long value = 0;
    if (std::from_chars(text.data(), text.data() + text.size(), value).ec != std::errc()) value = LLONG_MAX;
    return static_cast<int>(std::min<long long>(value, INT_MAX)) * (minus ? -1 : 1);
}

View from(View text, std::size_t position) { return text.substr(std::min(position, text.size())); }

class Lines {
  public:
    explicit Lines(View text) : text_(text) {}

    bool atEnd() const { return at_ >= text_.size(); }
    View rest() const { return from(text_, at_); }
    void skip(std::size_t count) { at_ += count; }

    // Up to a line feed, whose carriage returns on either side belong to it.
    View next() {
        const View all = rest();
        const std::size_t end = std::min(all.find('\n'), all.size());
        skip(end < all.size() ? end + 1 : end);
        while (!atEnd() && text_[at_] == '\r') ++at_;
        View line = all.substr(0, end);
        while (line.ends_with('\r')) line.remove_suffix(1);
        return line.substr(0, line.find('\0'));
    }

  private:
    View text_;
    std::size_t at_ = 0;
};

// --- SUB.

constexpr std::size_t longestNumber = 16;

struct Braces {
    int status;
    int value;
};

Braces readBraces(Lines& lines) {
    const View text = lines.rest();
    const std::size_t open = text.find('{');
    if (open == text.npos) return {QvStatus::endOfStream, 0};
    const std::size_t close = text.find('}', open);
    if (close == text.npos || close - open - 1 > longestNumber) return {QvStatus::failed, 0};
    lines.skip(close + 1);
    return {QvStatus::ok, number(text.substr(open + 1, close - open - 1))};
}

int readSubLine(Lines& lines, const QvFramerate& rate, const SubtitleTaker& take) {
    int frames[2];
    for (int& frame : frames) {
        const Braces braces = readBraces(lines);
        if (braces.status != QvStatus::ok) return braces.status;
        frame = braces.value;
    }
    const auto time = [&rate](int frame) { return MediaTime(frame, rate, MediaTime::defaultTimescale); };
    take({time(frames[0]), time(frames[1]), std::string(lines.next()), false});
    return QvStatus::ok;
}

// --- SRT.

constexpr long long ticksPerMs = MediaTime::defaultTimescale / 1000;

bool isTimesLine(View line) { return line.size() > 2 && line[2] == ':'; }

// "hh:mm:ss,mmm", of which only the places of the digits count.
MediaTime readTime(View text) {
    const long long hours = number(from(text, 0).substr(0, 2));
    const long long minutes = number(from(text, 3).substr(0, 2));
    const long long seconds = number(from(text, 6).substr(0, 2));
    const long long ms = number(from(text, 9));
    return MediaTime((((hours * 60) + minutes) * 60 + seconds) * 1000 * ticksPerMs + ms * ticksPerMs);
}

struct Times {
    MediaTime start;
    MediaTime end;
    bool subViewer;  // separated by a comma
};

std::optional<Times> readTimes(View line) {
    constexpr View arrow = "-->";
    const std::size_t afterSeconds = 8;  // the milliseconds may be short or missing
    if (const std::size_t at = line.find(arrow, afterSeconds); at != line.npos) {
        View end = from(line, at + arrow.size());
        end.remove_prefix(std::min(end.find_first_not_of(" \t"), end.size()));
        return Times{readTime(line.substr(0, at)), readTime(end), false};
    }
    if (const std::size_t at = line.find(',', 11); at != line.npos)
        return Times{readTime(line.substr(0, at)), readTime(from(line, at + 1)), true};
    return std::nullopt;
}

std::string readLines(Lines& lines) {
    std::string text;
    for (bool first = true; !lines.atEnd(); first = false) {
        const View line = lines.next();
        if (line.empty()) break;
        if (!first) text += '|';
        text += line;
    }
    return text;
}

void breakSubViewerLines(std::string& text) {
    constexpr View mark = "[br]";
    for (std::size_t at = text.find(mark); at != text.npos; at = text.find(mark, at + 1))
        text.replace(at, mark.size(), "|");
}

}  // namespace

int parseSub(std::string_view text, const QvFramerate& rate, const SubtitleTaker& take) {
    Lines lines(text);
    int status = QvStatus::ok;
    while (status == QvStatus::ok) status = readSubLine(lines, rate, take);
    return status == QvStatus::endOfStream ? QvStatus::ok : status;
}

std::size_t parseSrt(std::string_view text, const SubtitleTaker& take) {
    Lines lines(text);
    while (!lines.atEnd()) {
        View line = lines.next();
        if (line.empty()) continue;
        if (!isTimesLine(line)) {
            if (number(line) == 0) continue;
            const std::size_t left = lines.rest().size();
            line = lines.next();
            if (!isTimesLine(line)) return left;
        }
        const auto times = readTimes(line);
        if (!times) continue;
        ParsedSubtitle entry{times->start, times->end, readLines(lines), times->subViewer};
        if (times->subViewer) breakSubViewerLines(entry.text);
        take(std::move(entry));
    }
    return 0;
}
