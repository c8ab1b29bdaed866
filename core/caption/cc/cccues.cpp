#include "core/caption/cc/cccues.h"

#include <algorithm>
#include <array>

#include "core/caption/cc/cccharacters_p.h"
#include "core/caption/cc/line21_p.h"
#include "core/caption/cc/qvcc.h"

namespace {

constexpr int rowCount = 15, columnCount = 32;
constexpr double openSeconds = 4, lineSeconds = 0.5;

struct Cell {
    std::string_view character;  // empty: the picture is seen
    bool italic = false;
};
using Row = std::array<Cell, columnCount>;
using Memory = std::array<Row, rowCount>;

bool isBlank(const Cell& cell) { return cell.character.empty() || cell.character == " "; }

QvCcRow rowOf(const Row& row, int number) {
    const auto first = std::find_if_not(row.begin(), row.end(), isBlank);
    if (first == row.end()) return {number, 0, "", ""};
    const auto last = std::find_if_not(row.rbegin(), row.rend(), isBlank).base();
    QvCcRow text{number, static_cast<int>(first - row.begin()), "", ""};
    bool italic = false;
    std::string blanks;  // between styles they have none
    for (auto cell = first; cell != last; ++cell) {
        text.text += isBlank(*cell) ? " " : cell->character;
        if (isBlank(*cell)) {
            blanks += ' ';
            continue;
        }
        if (italic && !cell->italic) text.markup += "</i>";
        text.markup += blanks;
        if (!italic && cell->italic) text.markup += "<i>";
        text.markup += cell->character;
        italic = cell->italic;
        blanks.clear();
    }
    if (italic) text.markup += "</i>";
    return text;
}

std::vector<QvCcRow> rowsOf(const Memory& memory) {
    std::vector<QvCcRow> rows;
    for (int i = 0; i < rowCount; ++i)
        if (QvCcRow row = rowOf(memory[static_cast<size_t>(i)], i + 1); !row.text.empty())
            rows.push_back(std::move(row));
    return rows;
}

bool same(const std::vector<QvCcRow>& a, const std::vector<QvCcRow>& b) {
    return std::equal(a.begin(), a.end(), b.begin(), b.end(), [](const QvCcRow& x, const QvCcRow& y) {
        return x.row == y.row && x.column == y.column && x.markup == y.markup;
    });
}

// A receiver of one field: two memories, one of them on the screen.
class Receiver {
  public:
    explicit Receiver(bool hasServices) : line_(hasServices) {}

    void take(const MediaTime& now, int first, int second) {
        now_ = now;
        const QvLine21Code code = line_.take(first, second);
        if (code.kind == QvLine21Code::nothing) return;
        if (code.kind != QvLine21Code::characters)
            takeControl(code);
        else if (code.first >= 0x10 && !otherChannel_)
            for (const int byte : {code.first, code.second})
                if (byte >= 0x20) put(qvCcBasicCharacter(byte));
    }

    std::vector<QvCcCue> finish() {
        settle();
        if (!shown_.rows.empty()) {
            shown_.end = shown_.start + MediaTime(openSeconds);
            shown_.open = true;
            cues_.push_back(std::move(shown_));
        }
        return std::move(cues_);
    }

  private:
    enum class Mode { none, popOn, rollUp, paintOn };

    void takeControl(const QvLine21Code& code) {
        otherChannel_ = code.secondChannel;
        if (otherChannel_) return;
        switch (code.kind) {
            case QvLine21Code::address: address(code.first, code.second); break;
            case QvLine21Code::special: put(qvCcSpecialCharacter(code.second)); break;
            case QvLine21Code::style: changeStyle(code.second); break;
            case QvLine21Code::extended: putExtended(0x10 | code.first, code.second); break;
            case QvLine21Code::tab: column_ = std::min(column_ + code.second - 0x20, columnCount - 1); break;
            case QvLine21Code::command: command(code.second); break;
            default: break;
        }
    }

    // Rows in the order of their codes; each has two, by bit 5 of the second byte.
    void address(int code, int second) {
        constexpr int rows[8][2] = {{11, 11}, {1, 2}, {3, 4}, {12, 13}, {14, 15}, {5, 6}, {7, 8}, {9, 10}};
        const int row = rows[code][second >> 5 & 1];
        const int style = second & 0x1E;
        if (mode_ == Mode::rollUp && row != row_) moveRows(row);
        if (mode_ == Mode::paintOn && row != row_) settle();
        row_ = row;
        column_ = style >= 0x10 ? (style - 0x10) * 2 : 0;
        italic_ = style == 0x0E;
    }

    void changeStyle(int second) {
        put(" ");
        italic_ = (second & 0x0E) == 0x0E;
    }

    void command(int code) {
        switch (code) {
            case 0x20: mode_ = Mode::popOn; break;
            case 0x21: eraseBack(); break;
            case 0x24: eraseToEnd(); break;
            case 0x25:
            case 0x26:
            case 0x27: startRollUp(code - 0x23); break;
            case 0x29:
                settle();
                mode_ = Mode::paintOn;
                break;
            case 0x2A:
            case 0x2B: mode_ = Mode::none; break;  // text
            case 0x2C: changeScreen([this] { screen_ = {}; }); break;
            case 0x2D: carriageReturn(); break;
            case 0x2E: hidden_ = {}; break;
            case 0x2F:
                changeScreen([this] { std::swap(screen_, hidden_); });
                mode_ = Mode::popOn;
                break;
            default: break;
        }
    }

    void startRollUp(int depth) {
        if (mode_ != Mode::rollUp)
            changeScreen([this] {
                screen_ = {};
                hidden_ = {};
                row_ = rowCount;
                column_ = 0;
            });
        mode_ = Mode::rollUp;
        depth_ = depth;
    }

    Row& rowAt(int row) { return memory()[static_cast<size_t>(row - 1)]; }
    Memory& memory() { return mode_ == Mode::popOn ? hidden_ : screen_; }

    void put(std::string_view character) {
        if (mode_ == Mode::none) return;
        changed();
        rowAt(row_)[static_cast<size_t>(column_)] = {character, italic_};
        column_ = std::min(column_ + 1, columnCount - 1);
    }
    // In the place of the basic character that was sent for receivers without it.
    void putExtended(int first, int second) {
        if (column_ > 0) --column_;
        put(qvCcExtendedCharacter(first, second));
    }
    void eraseBack() {
        if (mode_ == Mode::none || column_ == 0) return;
        changed();
        rowAt(row_)[static_cast<size_t>(--column_)] = {};
    }
    void eraseToEnd() {
        if (mode_ == Mode::none) return;
        if (mode_ != Mode::popOn) settle();
        changed();
        for (int i = column_; i < columnCount; ++i) rowAt(row_)[static_cast<size_t>(i)] = {};
    }
    // The line that comes now belongs to what has rolled up, unless it lets wait for itself.
    void carriageReturn() {
        if (mode_ != Mode::rollUp) return;
        settle();
        roll();
        pending_ = rolled_ = true;
        changedAt_ = now_;
    }
    void roll() {
        const int top = std::max(row_ - depth_ + 1, 1);
        for (int row = 1; row < top; ++row) rowAt(row) = {};
        for (int row = top; row < row_; ++row) rowAt(row) = rowAt(row + 1);
        rowAt(row_) = {};
        column_ = 0;
        italic_ = false;
    }
    // The rows that roll go with their base.
    void moveRows(int base) {
        changeScreen([&] {
            const Memory before = screen_;
            screen_ = {};
            for (int i = 0; i < depth_ && row_ - i >= 1 && base - i >= 1; ++i)
                screen_[static_cast<size_t>(base - i - 1)] = before[static_cast<size_t>(row_ - i - 1)];
        });
    }

    // --- Cues. Characters that appear one by one belong to the state that they lead to.
    void changed() {
        if (mode_ == Mode::popOn) return;
        if (rolled_ && changedAt_ + MediaTime(lineSeconds) < now_) settle();
        rolled_ = false;
        if (pending_) return;
        pending_ = true;
        changedAt_ = now_;
    }
    template <class Change>
    void changeScreen(Change change) {
        settle();
        change();
        pending_ = true;
        changedAt_ = now_;
        settle();
    }
    void settle() {
        if (!pending_) return;
        pending_ = rolled_ = false;
        auto rows = rowsOf(screen_);
        if (same(rows, shown_.rows)) return;
        if (!shown_.rows.empty() && shown_.start < changedAt_) {
            shown_.end = changedAt_;
            cues_.push_back(std::move(shown_));
        }
        shown_ = {changedAt_, changedAt_, std::move(rows)};
    }

    Memory screen_{}, hidden_{};
    Mode mode_ = Mode::none;
    int row_ = rowCount, column_ = 0, depth_ = 2;
    bool italic_ = false;
    QvLine21Reader line_;
    bool otherChannel_ = false;
    MediaTime now_, changedAt_;
    bool pending_ = false;  // since changedAt_
    bool rolled_ = false;   // nothing has come after a carriage return
    QvCcCue shown_;
    std::vector<QvCcCue> cues_;
};

std::string joined(const std::vector<QvCcRow>& rows, std::string QvCcRow::*text) {
    std::string all;
    for (const QvCcRow& row : rows) {
        if (!all.empty()) all += '\n';
        all += row.*text;
    }
    return all;
}

}  // namespace

std::string QvCcCue::text() const { return joined(rows, &QvCcRow::text); }
std::string QvCcCue::markup() const { return joined(rows, &QvCcRow::markup); }

std::vector<QvCcCue> qvCcCues(std::span<const QvCcBytePair> pairs, int type) {
    Receiver receiver(type == QvCcBytePair::field2);
    const QvRatio frames(30000, 1001);
    MediaTime lineTime;
    long long place = -1;  // in its line
    for (const auto& pair : pairs) {
        if (pair.type() != type) continue;
        place = place >= 0 && pair.time == lineTime ? place + 1 : 0;
        lineTime = pair.time;
        if (pair.valid())
            receiver.take(lineTime + MediaTime(place, frames, MediaTime::defaultTimescale), pair.byte1 & 0x7F,
                          pair.byte2 & 0x7F);
    }
    return receiver.finish();
}
