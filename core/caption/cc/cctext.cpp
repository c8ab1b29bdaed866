#include "core/caption/cc/cctext.h"

#include <string_view>

#include "core/caption/cc/cccharacters_p.h"
#include "core/caption/cc/qvcc.h"

namespace {

class Reader {
  public:
    explicit Reader(bool hasServices) : hasServices_(hasServices) {}

    void take(int first, int second) {
        if (first >= 0x10 && first < 0x20) {
            takeControl(first, second);
            return;
        }
        lastControl_ = 0;
        if (hasServices_ && first != 0 && first < 0x10) {  // start, continue or, with 0x0F, end
            inService_ = first != 0x0F;
        } else if (!inService_) {
            for (const int code : {first, second})
                if (code >= 0x20) row_ += qvCcBasicCharacter(code);
        }
    }

    std::string text() {
        endRow();
        return text_;
    }

  private:
    void takeControl(int first, int second) {
        inService_ = false;
        const int control = first << 8 | second;
        const bool again = control == lastControl_;
        lastControl_ = again ? 0 : control;  // sent twice, meant once
        if (again) return;
        const int code = first & 0x17;  // without the channel
        if (second >= 0x40)
            endRow();  // an address
        else if (code == 0x11 && second >= 0x30)
            row_ += qvCcSpecialCharacter(second);
        else if (code == 0x11 && second >= 0x20)
            separate();  // a change of style takes a column
        else if ((code == 0x12 || code == 0x13) && second >= 0x20)
            replaceLast(qvCcExtendedCharacter(code, second));
        else if (code == 0x17 && second >= 0x21 && second <= 0x23)
            separate();  // a tab
        else if ((code == 0x14 || code == 0x15) && second == 0x21)
            removeLast();
        else if ((code == 0x14 || code == 0x15) && second == 0x2D)
            endRow();
    }

    // An extended character follows a basic one for receivers that don't know it.
    void replaceLast(std::string_view character) {
        removeLast();
        row_ += character;
    }
    void removeLast() {
        while (!row_.empty() && (row_.back() & 0xC0) == 0x80) row_.pop_back();
        if (!row_.empty()) row_.pop_back();
    }
    void separate() {
        if (!row_.empty() && row_.back() != ' ') row_ += ' ';
    }
    void endRow() {
        row_.erase(row_.find_last_not_of(' ') + 1);
        row_.erase(0, row_.find_first_not_of(' '));
        if (!row_.empty() && !text_.empty()) text_ += '|';
        text_ += row_;
        row_.clear();
    }

    std::string text_, row_;
    bool hasServices_;  // data services stand between the captions
    int lastControl_ = 0;
    bool inService_ = false;
};

}  // namespace

std::string qvCcText(std::span<const QvCcBytePair> pairs, int type) {
    Reader reader(type == QvCcBytePair::field2);
    for (const auto& pair : pairs)
        if (pair.type() == type && pair.valid()) reader.take(pair.byte1 & 0x7F, pair.byte2 & 0x7F);
    return reader.text();
}
