#include "tarsel/words/timespec.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <cstdio>
#include <iterator>
#include <limits>
#include <vector>

#include "tarsel/words/messages.h"

namespace {

constexpr long long kTicks = MediaTime::defaultTimescale;
constexpr long long kLongest = 1000LL * 3600 * 24;  // seconds; a bound, not a wish

std::optional<long long> number(std::string_view text) {
    long long value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size() || text.empty()) return std::nullopt;
    return value;
}

std::vector<std::string_view> split(std::string_view text, std::string_view separators) {
    std::vector<std::string_view> parts;
    size_t start = 0;
    for (size_t i = 0; i <= text.size(); ++i) {
        if (i < text.size() && separators.find(text[i]) == std::string_view::npos) continue;
        parts.push_back(text.substr(start, i - start));
        start = i + 1;
    }
    return parts;
}

// "12.345" as ticks, exact to the tick; digits after the ninth decimal do not count.
std::optional<long long> secondsToTicks(std::string_view text) {
    const size_t point = text.find('.');
    const auto whole = number(text.substr(0, point));
    if (!whole || *whole < 0 || *whole > kLongest || text[0] == '-') return std::nullopt;
    long long ticks = *whole * kTicks;
    if (point == std::string_view::npos) return ticks;
    std::string_view decimals = text.substr(point + 1, 9);
    if (decimals.empty()) return std::nullopt;
    for (char c : text.substr(point + 1))
        if (c < '0' || c > '9') return std::nullopt;
    long long value = 0, scale = 1;
    for (char c : decimals) {
        value = value * 10 + (c - '0');
        scale *= 10;
    }
    return ticks + static_cast<long long>(static_cast<__int128>(value) * kTicks / scale);
}

std::optional<MediaTime> clockTime(const std::vector<std::string_view>& parts) {
    long long seconds = 0;
    for (size_t i = 0; i + 1 < parts.size(); ++i) {
        const auto value = number(parts[i]);
        if (!value || *value < 0 || (i > 0 && *value > 59) || *value > kLongest / 3600) return std::nullopt;
        seconds = (seconds + *value) * 60;
    }
    const auto last = secondsToTicks(parts.back());
    if (!last || (parts.size() > 1 && *last >= 60 * kTicks)) return std::nullopt;
    return MediaTime(seconds * kTicks + *last, kTicks);
}

}  // namespace

MediaTime parseTime(std::string_view text, const std::optional<QvFramerate>& rate, std::string_view option) {
    const auto refuse = [&] { throw failure(Msg::timeWrong, {option, text}); };
    const auto needRate = [&]() -> const QvFramerate& {
        if (!rate) throw failure(Msg::timeCountsFrames, {option, text});
        return *rate;
    };
    if (!text.empty() && text.back() == 'f') {
        const auto frames = number(text.substr(0, text.size() - 1));
        if (!frames || *frames < 0 || *frames > 0x7FFFFFFF) refuse();
        return qvInstantOf(*frames, needRate().rate());
    }
    const auto parts = split(text, ":;");
    if (parts.size() == 4) {
        for (size_t i = 0; i < 4; ++i) {
            const auto value = number(parts[i]);
            if (!value || *value < 0 || *value > (i == 0 ? 99 : i == 3 ? 999 : 59)) refuse();
        }
        QvFramerate counting = needRate();
        const QvTimecode code{std::string(text).c_str()};
        counting.setDf(code.df());
        const long long frame = code.frameNr(counting, false);
        return qvInstantOf(frame, counting.rate());
    }
    if (text.find(';') != std::string_view::npos || parts.size() > 3) refuse();
    const auto time = clockTime(parts);
    if (!time) refuse();
    return *time;
}

namespace {

// Rates that have a name, and those that are written with fewer digits than they have.
constexpr struct {
    std::string_view name;
    int num, den;
} kRateNames[] = {
    {"pal", 25, 1},
    {"ntsc", 30000, 1001},
    {"film", 24, 1},
    {"ntsc-film", 24000, 1001},
};
constexpr double kLeastRate = 0.001, kMostRate = 100000000;
constexpr std::string_view kDropFrame = "df";
constexpr int kNtscRates[] = {24, 30, 48, 60, 120};  // times 1000/1001

// 23.976, 23.98 and 29.97 as the exact rates that they stand for.
std::optional<QvRatio> ntscRate(double value) {
    for (const int rate : kNtscRates)
        if (std::abs(value - rate * 1000 / 1001.0) < 0.005) return QvRatio(rate * 1000, 1001);
    return std::nullopt;
}

std::optional<QvRatio> ratioOf(std::string_view text) {
    for (const auto& row : kRateNames)
        if (text == row.name) return QvRatio(row.num, row.den);
    if (const auto parts = split(text, "/"); parts.size() == 2) {
        const auto num = number(parts[0]), den = number(parts[1]);
        constexpr int most = std::numeric_limits<int>::max();
        if (!num || !den || *num < 1 || *den < 1 || *num > most || *den > most) return std::nullopt;
        const double value = static_cast<double>(*num) / static_cast<double>(*den);
        if (!(value >= kLeastRate && value <= kMostRate)) return std::nullopt;
        return QvRatio(static_cast<int>(*num), static_cast<int>(*den));
    }
    double value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error != std::errc() || end != text.data() + text.size() ||
        !(value >= kLeastRate && value <= kMostRate))
        return std::nullopt;
    if (const auto ntsc = ntscRate(value)) return ntsc;
    return QvFramerate(value).rate();
}

}  // namespace

MediaTime parseInstant(std::string_view text, const std::optional<QvFramerate>& rate, std::string_view option,
                       const MediaTime& length) {
    if (text.empty() || text[0] != '-') return parseTime(text, rate, option);
    const std::string_view before = text.substr(1);
    // By frames, as a length need not be a whole number of them in ticks.
    const bool frames = rate && before.ends_with('f');
    const MediaTime back = parseTime(before, rate, option);
    const MediaTime at =
        frames ? qvInstantOf(length.position(*rate) - back.position(*rate), rate->rate()) : length - back;
    if (at < MediaTime()) throw failure(Msg::timeBeforeStart, {option, text, formatTime(length.seconds())});
    return at;
}

MediaTime parseSpan(std::string_view text, const std::optional<QvFramerate>& rate, std::string_view option,
                    const MediaTime& from) {
    const MediaTime span = parseTime(text, rate, option);
    if (!rate || !text.ends_with('f')) return from + span;
    return qvInstantOf(from.position(*rate) + span.position(*rate), rate->rate());
}

namespace {

// The rate whose fields an interlaced rate seems to count: no material has more than 30 interlaced frames a
// second.
std::optional<QvFramerate> ofFields(const QvFramerate& rate) {
    if (rate.interlaced() == 0 || rate.rate().den > std::numeric_limits<int>::max() / 2) return std::nullopt;
    const QvFramerate half(QvRatio(rate.rate().num, rate.rate().den * 2), rate.interlaced());
    for (const QvFramerate& known : {QvFramerate::f23p(), QvFramerate::f24p(), QvFramerate::f25p(),
                                     QvFramerate::f29p(), QvFramerate::f30p()})
        if (half.rate() == known.rate()) return half;
    return std::nullopt;
}

}  // namespace

QvFramerate parseRate(std::string_view text, std::string_view option) {
    std::string_view digits = text;
    int interlaced = 0;
    bool frames = false;
    if (!digits.empty() && (digits.back() == 'i' || digits.back() == 'b' || digits.back() == 'p')) {
        interlaced = digits.back() == 'i' ? 1 : digits.back() == 'b' ? 2 : 0;
        digits.remove_suffix(1);
        frames = interlaced != 0 && digits.ends_with('f');
        if (frames) digits.remove_suffix(1);
    }
    const auto ratio = ratioOf(digits);
    if (!ratio) throw failure(Msg::rateWrong, {option, text});
    const QvFramerate rate(*ratio, interlaced);
    if (!frames) requireFrames(rate, text, option);
    return rate;
}

void requireFrames(const QvFramerate& rate, std::string_view text, std::string_view option) {
    if (const auto half = ofFields(rate)) throw failure(Msg::rateOfFields, {option, text, formatRate(*half)});
}

std::string formatRate(const QvFramerate& rate) {
    const char* const letter = rate.interlaced() == 0 ? "" : rate.isTopFirst() ? "i" : "b";
    const std::string scan = std::string(ofFields(rate) ? "f" : "") + letter;
    const QvRatio exact = rate.rate();
    if (exact.den == 1) return std::to_string(exact.num) + scan;
    for (int decimals = 1; decimals <= 3; ++decimals) {
        char text[32];
        const double value = exact;
        const auto written = std::to_chars(text, std::end(text), value, std::chars_format::fixed, decimals);
        double shown = 0;
        std::from_chars(text, written.ptr, shown);
        if (std::abs(shown - value) > 0.0005) continue;  // 23.98 would do, but 23.976 is what people know
        const auto read = ratioOf({text, written.ptr});
        if (read && read->num == exact.num && read->den == exact.den)
            return std::string(text, written.ptr) + scan;
    }
    return std::to_string(exact.num) + "/" + std::to_string(exact.den) + scan;
}

QvFramerate parseTimecodeRate(std::string_view text, std::string_view option) {
    const bool dropFrame = text.ends_with(kDropFrame);
    QvFramerate rate = parseRate(dropFrame ? text.substr(0, text.size() - kDropFrame.size()) : text, option);
    if (dropFrame && !rate.is29p() && !rate.is59p()) throw failure(Msg::rateNoDropFrame, {option, text});
    rate.setDf(dropFrame);
    return rate;
}

std::string formatTimecodeRate(const QvFramerate& rate) {
    return formatRate(rate) + std::string(rate.df() ? kDropFrame : "");
}

Size parseSize(std::string_view text, std::string_view option, int most, Msg wrong) {
    const auto parts = split(text, "xX");
    if (parts.size() == 2) {
        const auto width = number(parts[0]), height = number(parts[1]);
        if (width && height && *width >= 1 && *height >= 1 && *width <= most && *height <= most)
            return {static_cast<int>(*width), static_cast<int>(*height)};
    }
    throw failure(wrong, {option, text});
}

Size parseSizeOrShape(std::string_view text, std::string_view option) {
    const size_t x = text.find_first_of("xX");
    const auto parts = {text.substr(0, x), x == std::string_view::npos ? "" : text.substr(x + 1)};
    if (std::count(parts.begin(), parts.end(), "-1") != 1)
        return parseSize(text, option, 65535, Msg::sizeOrShapeWrong);
    const bool first = *parts.begin() == "-1";
    const auto given = number(first ? *std::next(parts.begin()) : *parts.begin());
    if (!given || *given < 1 || *given > 65535) throw failure(Msg::sizeOrShapeWrong, {option, text});
    const int length = static_cast<int>(*given);
    return first ? Size{-1, length} : Size{length, -1};
}

long long parseNumber(std::string_view text, long long low, long long high, std::string_view option) {
    const auto value = number(text);
    if (!value || *value < low || *value > high)
        throw failure(Msg::wholeWrong, {option, text, std::to_string(low), std::to_string(high)});
    return *value;
}

double parseDecimal(std::string_view text, double low, double high, std::string_view option) {
    double value = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
    if (error == std::errc() && end == text.data() + text.size() && value >= low && value <= high)
        return value;
    char from[32], to[32];
    std::snprintf(from, sizeof from, "%g", low);
    std::snprintf(to, sizeof to, "%g", high);
    throw failure(Msg::decimalWrong, {option, text, from, to});
}

unsigned parsePixel(std::string_view text, std::string_view option) {
    std::vector<std::string> known;
    for (const QvPixelFormat& format : qvPixelFormats()) {
        known.push_back(fourccText(format.fourcc));
        if (text == known.back()) return format.fourcc;
    }
    throw failure(Msg::pixelUnknown, {option, text, suggestion(text, known)});
}

std::string fourccText(unsigned fourcc) {
    std::string text;
    for (int i = 0; i < 4; ++i) text += static_cast<char>(fourcc >> (8 * i) & 0xFF);
    while (!text.empty() && text.back() == ' ') text.pop_back();
    return text;
}

std::string formatTime(double seconds) {
    if (!(seconds >= 0)) return "unknown";
    const long long ms = std::llround(seconds * 1000);
    char text[48];
    std::snprintf(text, sizeof text, "%lld:%02lld:%02lld.%03lld", ms / 3600000, ms / 60000 % 60,
                  ms / 1000 % 60, ms % 1000);
    return text;
}

std::string formatBytes(long long bytes) {
    const char* unit[] = {"B", "KiB", "MiB", "GiB", "TiB"};
    double value = static_cast<double>(bytes);
    int u = 0;
    for (; value >= 1024 && u < 4; ++u) value /= 1024;
    char text[32];
    std::snprintf(text, sizeof text, u ? "%.1f %s" : "%.0f %s", value, unit[u]);
    return text;
}
