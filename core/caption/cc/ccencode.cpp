// Pop-on captions: each is loaded unseen, then shown by one code, and removed from the screen by another.
//
//     RCL RCL ENM ENM | address, text of each row ... | EOC EOC          EDM EDM
//     '--------- before the start, a pair a frame ---' at the start      at the end
#include <algorithm>
#include <bit>
#include <set>

#include "core/caption/cc/cccharacters_p.h"
#include "core/caption/cc/cccues.h"
#include "core/caption/cc/qvcc.h"
#include "core/measure/qvratio.h"
#include "core/value/utf.h"

namespace {

constexpr size_t columnCount = 32, mostRows = 4;
constexpr int resumeLoading = 0x1420, eraseHidden = 0x142E, endOfCaption = 0x142F, eraseScreen = 0x142C;
const QvRatio frames(30000, 1001);   // a pair in each frame, also if the timecodes are of another rate
constexpr long long codeFrames = 2;  // a code and its repetition

using Text = std::vector<char32_t>;  // GCC 12 gives false alarms about std::u32string
using Words = std::vector<int>;      // without parity

int withParity(int byte) { return std::popcount(static_cast<unsigned>(byte)) % 2 ? byte : byte | 0x80; }

std::vector<Text> wordsOf(const Text& row) {
    std::vector<Text> words(1);
    for (const char32_t c : row) {
        if (c != ' ')
            words.back().push_back(c);
        else if (!words.back().empty())
            words.emplace_back();
    }
    if (words.back().empty()) words.pop_back();
    return words;
}

// Rows of up to `width` characters; a longer word is cut.
std::vector<Text> filled(const std::vector<Text>& words, size_t width) {
    std::vector<Text> rows;
    for (const Text& word : words) {
        if (!rows.empty() && rows.back().size() + 1 + word.size() <= width) {
            rows.back().push_back(U' ');
            rows.back().insert(rows.back().end(), word.begin(), word.end());
            continue;
        }
        auto from = word.begin();
        for (; word.end() - from > static_cast<std::ptrdiff_t>(width);
             from += static_cast<std::ptrdiff_t>(width))
            rows.emplace_back(from, from + static_cast<std::ptrdiff_t>(width));
        rows.emplace_back(from, word.end());
    }
    return rows;
}

// As few rows as possible, the longest of them as short as possible.
std::vector<Text> balanced(const Text& row) {
    const auto words = wordsOf(row);
    size_t narrowest = 1;
    for (const Text& word : words) narrowest = std::max(narrowest, std::min(word.size(), columnCount));
    auto best = filled(words, columnCount);
    for (size_t width = columnCount; width-- > narrowest;) {
        auto narrower = filled(words, width);
        if (narrower.size() > best.size()) break;
        best = std::move(narrower);
    }
    return best;
}

class Encoder {
  public:
    explicit Encoder(QvCcLosses& losses) : losses_(losses) {}

    // Cues in the order of time.
    void add(const QvCcCue& cue) {
        const long long start = slot(cue.start);
        const Words load = loadOf(cue);
        // If the next caption follows within the clearing code, it replaces this one without it.
        const bool clears = clearAt_ >= 0 && clearAt_ + codeFrames < start;
        const auto loading = static_cast<long long>(load.size());
        long long begin = start - loading;
        if (clears && clearAt_ + codeFrames > begin) begin -= codeFrames;
        begin = std::max(begin, free_);
        if (clears && clearAt_ + codeFrames <= begin) clear();
        put(begin, load, clears && clearAt_ >= 0);
        const long long shown = std::max(start, free_);
        put(shown, {endOfCaption, endOfCaption});
        if (shown > start) {
            ++losses_.late;
            losses_.latest = std::max(losses_.latest, seconds(shown - start));
        }
        clearAt_ = std::max(slot(cue.end), shown + codeFrames);
    }

    QvCcData finish() {
        if (clearAt_ >= 0) clear();
        return std::move(data_);
    }

  private:
    // The nearest frame.
    long long slot(const MediaTime& time) const {
        return std::max((time + MediaTime(500.5 / 30000)).position(frames), 0LL);
    }
    double seconds(long long slots) const {
        return MediaTime(slots, frames, MediaTime::defaultTimescale).seconds();
    }

    Words loadOf(const QvCcCue& cue) {
        std::vector<Text> rows;
        for (const QvCcRow& row : cue.rows)
            for (Text& part : balanced(decoded(row.text))) rows.push_back(std::move(part));
        if (rows.size() > mostRows) {
            ++losses_.cut;
            rows.resize(mostRows);
        }
        Words words = {resumeLoading, resumeLoading, eraseHidden, eraseHidden};
        for (size_t i = 0; i < rows.size(); ++i)
            putRow(words, static_cast<int>(15 - rows.size() + 1 + i), rows[i]);
        return words;
    }

    Text decoded(std::string_view text) {
        Text characters;
        for (size_t at = 0; at < text.size();) {
            const char32_t c = QvUtf::next(text, at);
            if (c < 0x20) {
                characters.push_back(U' ');
                continue;
            }
            const bool known = qvCcCodeOf(c).has_value();
            characters.push_back(known ? c : U'?');
            if (!known && missing_.insert(c).second) QvUtf::append(losses_.characters, c);
        }
        return characters;
    }

    static void putRow(Words& words, int row, const Text& text) {
        constexpr int addresses[] = {0,      0x1140, 0x1160, 0x1240, 0x1260, 0x1540, 0x1560, 0x1640,
                                     0x1660, 0x1740, 0x1760, 0x1040, 0x1340, 0x1360, 0x1440, 0x1460};
        const auto column = static_cast<int>((columnCount - text.size()) / 2);
        const int address = addresses[row] + 0x10 + column / 4 * 2;
        words.insert(words.end(), 2, address);
        if (column % 4 > 0) words.insert(words.end(), 2, 0x1720 + column % 4);
        int half = 0;  // the first byte of a pair
        const auto putByte = [&](int byte) {
            if (half != 0) words.push_back(half << 8 | byte);
            half = half != 0 ? 0 : byte;
        };
        for (const char32_t c : text) {
            const QvCcCode code = *qvCcCodeOf(c);
            if (code.first == 0) {
                putByte(code.code);
                continue;
            }
            if (code.fallback != 0) putByte(code.fallback);
            if (half != 0) putByte(0);
            words.insert(words.end(), 2, code.first << 8 | code.code);
        }
        if (half != 0) putByte(0);
    }

    // At `begin`, or as soon as the place is free. `clearing`: the screen is to be cleared meanwhile, between
    // two pairs that are no code and its repetition.
    void put(long long begin, const Words& words, bool clearing = false) {
        begin = std::max(begin, free_);
        MediaTime time(begin, frames, MediaTime::defaultTimescale);
        long long at = begin;
        for (size_t i = 0; i < words.size(); ++i) {
            const bool between = i == 0 || words[i] != words[i - 1] || words[i] < 0x1000 || words[i] > 0x1FFF;
            if (clearing && between && at >= clearAt_) {
                clearing = false;
                for (int n = 0; n < codeFrames; ++n, ++at) append(time, eraseScreen);
                clearAt_ = -1;
            }
            append(time, words[i]);
            ++at;
        }
        free_ = at;
        if (clearing) clear();
    }
    void clear() {
        const long long at = clearAt_;
        clearAt_ = -1;
        put(at, {eraseScreen, eraseScreen});
    }
    void append(const MediaTime& time, int word) {
        data_.append(
            QvCcBytePair(time, QvCcBytePair::field1, withParity(word >> 8), withParity(word & 0xFF), true));
    }

    QvCcLosses& losses_;
    std::set<char32_t> missing_;
    QvCcData data_;
    long long free_ = 0;      // the first frame with no pair yet
    long long clearAt_ = -1;  // when the caption on the screen ends; -1: there is none
};

}  // namespace

QvCcData qvCcEncode(std::vector<QvCcCue> cues, QvCcLosses& losses) {
    std::stable_sort(cues.begin(), cues.end(),
                     [](const QvCcCue& a, const QvCcCue& b) { return a.start < b.start; });
    losses = {};
    Encoder encoder(losses);
    for (const QvCcCue& cue : cues) encoder.add(cue);
    return encoder.finish();
}
