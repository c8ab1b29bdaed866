#include "core/caption/cc/sccfile_p.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string>
#include <string_view>

#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/stream/qvbytesource.h"

namespace {

constexpr std::string_view signature = "Scenarist_SCC";
constexpr std::string_view mark = "\xEF\xBB\xBF";
constexpr std::size_t longestLine = 8192;  // the rest counts as a line of its own
constexpr std::size_t blockSize = 64 * 1024;
constexpr std::size_t wordDigits = 4;
constexpr std::size_t longestShown = 20;  // of a damaged word
constexpr std::size_t shortestTimecode = 7, longestTimecode = 11;
constexpr int timecodeParts = 4;
constexpr long largestFrameField = 60;
constexpr long largestHour = 9900;  // the frames of more go beyond an int

class LineReader {
  public:
    // `returns`: a carriage return ends a line, too, and a UTF-8 mark is no part of the first one.
    LineReader(QvByteSource& source, bool returns)
        : source_(source), block_(new char[blockSize]), returns_(returns) {
        refill();
        if (returns && std::string_view(block_.get(), end_).starts_with(mark)) begin_ = mark.size();
    }

    // The next line without its end, valid until the next call.
    bool next(std::string_view& line) {
        if (end_ - begin_ <= longestLine) refill();
        if (begin_ == end_) return false;
        const std::string_view rest(block_.get() + begin_, std::min(end_ - begin_, longestLine));
        std::size_t end = std::min(rest.find('\n'), rest.size());
        if (returns_) end = std::min(rest.substr(0, end).find('\r'), end);
        // Of both, as Windows writes them, the second ends no line of its own.
        const bool pair = rest.substr(end).starts_with("\r\n");
        line = rest.substr(0, end);
        begin_ += end + (pair ? 2 : end < rest.size() ? 1 : 0);
        return true;
    }
    bool failed() const { return failed_; }

  private:
    void refill() {
        if (atEnd_) return;
        std::memmove(block_.get(), block_.get() + begin_, end_ - begin_);
        end_ -= begin_;
        begin_ = 0;
        const std::size_t got = source_.read(block_.get() + end_, blockSize - end_);
        const bool endless =
            source_.size() == QvByteSource::unknown && source_.position() > QvByteSource::mostUnknown;
        atEnd_ = got == 0 || endless;
        failed_ = endless || (got == 0 && !source_.problem().empty());
        end_ += got;
    }

    QvByteSource& source_;
    std::unique_ptr<char[]> block_;
    bool returns_;
    std::size_t begin_ = 0, end_ = 0;
    bool atEnd_ = false;
    bool failed_ = false;
};

// Control characters are blanks, too.
bool isBlank(char c) { return static_cast<unsigned char>(c) <= ' '; }

// Takes the first token off `rest`; empty at its end.
std::string_view nextToken(std::string_view& rest) {
    const auto begin = std::find_if_not(rest.begin(), rest.end(), isBlank);
    const auto end = std::find_if(begin, rest.end(), isBlank);
    const std::string_view token(begin, end);
    rest = std::string_view(end, rest.end());
    return token;
}

// "HH:MM:SS:FF", with `dropFrameLines` also with ";". A part is read up to its first character that is no
// digit.
bool readTimecode(std::string_view token, bool dropFrameLines, QvTimecode& timecode) {
    if (token.size() < shortestTimecode || token.size() > longestTimecode) return false;
    char text[longestTimecode + 1] = {};
    std::copy(token.begin(), token.end(), text);
    const bool semicolon = dropFrameLines && std::strchr(text, ';');
    if (semicolon) std::replace(text, text + token.size(), ';', ':');
    if (std::count(text, text + token.size(), ':') != timecodeParts - 1) return false;
    std::array<int, timecodeParts> parts{};
    const char* at = text;
    for (int& part : parts) {
        const long value = std::strtol(at, nullptr, 10);
        if (value < 0) return false;
        part = static_cast<int>(value);
        const char* colon = std::strchr(at, ':');
        at = colon ? colon + 1 : "";
    }
    if (parts.front() > largestHour || parts.back() > largestFrameField) return false;
    timecode = QvTimecode(parts[0], parts[1], parts[2], parts[3], semicolon);
    return true;
}

// Of each byte, -1 for what is no digit.
constexpr auto hexDigits = [] {
    std::array<short, 256> digits{};
    digits.fill(-1);
    for (int i = 0; i < 16; ++i)
        digits[static_cast<unsigned char>("0123456789abcdef"[i])] =
            digits[static_cast<unsigned char>("0123456789ABCDEF"[i])] = static_cast<short>(i);
    return digits;
}();

// Four digits; what is no digit ends the number, as in "942x".
std::uint16_t readWord(std::string_view token) {
    int value = 0;
    for (const char c : token) {
        const int digit = hexDigits[static_cast<unsigned char>(c)];
        if (digit < 0)
            return static_cast<std::uint16_t>(std::strtol(std::string(token).c_str(), nullptr, 16));
        value = value * 16 + digit;
    }
    return static_cast<std::uint16_t>(value);
}

bool isWord(std::string_view token) {
    return token.size() == wordDigits && std::all_of(token.begin(), token.end(), [](char c) {
               return hexDigits[static_cast<unsigned char>(c)] >= 0;
           });
}

void report(SccFile& scc, int number, const std::string& what) {
    if (++scc.damaged <= SccFile::mostReported) scc.damage.emplace_back(number, what);
}

void readLine(std::string_view line, int number, bool dropFrameLines, SccFile& scc) {
    SccLine kept{};
    std::string_view token;
    int tokens = 0;
    do {
        token = nextToken(line);
        if (token.empty()) {
            if (tokens > 0) report(scc, number, "there is no timecode HH:MM:SS:FF");
            return;
        }
        ++tokens;
    } while (!readTimecode(token, dropFrameLines, kept.timecode));
    while (!(token = nextToken(line)).empty()) {
        if (!isWord(token))
            report(
                scc, number,
                "'" + std::string(token.substr(0, longestShown)) + "' is no word of four hexadecimal digits");
        if (token.size() != wordDigits) continue;
        scc.words.push_back(readWord(token));
        ++kept.words;
    }
    if (kept.words == 0) return;
    scc.highestFrame = std::max(scc.highestFrame, kept.timecode.frames());
    scc.dropFrame |= kept.timecode.df();
    scc.lines.push_back(kept);
}

}  // namespace

int SccFile::read(const Any& filename, bool dropFrameLines) {
    if (const auto file = qvFileSource(filename)) return read(*file, filename, dropFrameLines);
    qv_dbg()->error("Failed to open SCC file %s.", filename.toString().asString(""));
    return QvStatus::failed;
}

int SccFile::read(QvByteSource& source, const Any& filename, bool dropFrameLines) {
    const Any name = filename.toString();
    const auto refuse = [&name] {
        qv_dbg()->error("Failed to open SCC file %s.", name.asString(""));
        return QvStatus::failed;
    };
    LineReader reader(source, dropFrameLines);
    std::string_view line;
    const bool known = reader.next(line) && line.starts_with(signature);
    if (reader.failed()) return refuse();
    if (!known) return QvStatus::noSegment;
    bool tooLong = false;
    for (int number = 2; reader.next(line); ++number) {
        tooLong |= line.size() == longestLine;
        readLine(line, number, dropFrameLines, *this);
    }
    if (reader.failed()) return refuse();
    if (tooLong)
        qv_log()->warning("%s has lines of more than %d bytes, their ends are not read", name.asString(""),
                          static_cast<int>(longestLine));
    return QvStatus::ok;
}

QvFramerate SccFile::likelyRate(bool warn) const {
    if (lines.empty()) return QvFramerate::f29p();
    if (dropFrame) {  // that exists at these two rates only
        QvFramerate rate = highestFrame >= 30 ? QvFramerate::f59p() : QvFramerate::f29p();
        rate.setDf(true);
        return rate;
    }
    if (highestFrame >= 30) return QvFramerate::f59p();
    if (highestFrame >= 24) return QvFramerate::f29p();
    if (warn && highestFrame != 23)
        qv_log()->warning("Framerate guess could be inaccurate, not enough frames to be sure");
    return QvFramerate::f23p();
}
