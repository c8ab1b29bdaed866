#include "core/caption/cc/cctext.h"

#include <string_view>

#include "core/caption/cc/cccharacters_p.h"
#include "core/caption/cc/line21_p.h"
#include "core/caption/cc/qvcc.h"

namespace {

class Reader {
  public:
    explicit Reader(bool hasServices) : line_(hasServices) {}

    void take(int first, int second) {
        const QvLine21Code code = line_.take(first, second);
        switch (code.kind) {
            case QvLine21Code::characters:
                for (const int byte : {code.first, code.second})
                    if (byte >= 0x20) row_ += qvCcBasicCharacter(byte);
                break;
            case QvLine21Code::address: endRow(); break;
            case QvLine21Code::special: row_ += qvCcSpecialCharacter(code.second); break;
            case QvLine21Code::style:
            case QvLine21Code::tab: separate(); break;
            case QvLine21Code::extended:
                replaceLast(qvCcExtendedCharacter(0x10 | code.first, code.second));
                break;
            case QvLine21Code::command:
                if (code.second == 0x21) removeLast();
                if (code.second == 0x2D) endRow();
                break;
            default: break;
        }
    }

    std::string text() {
        endRow();
        return text_;
    }

  private:
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
    QvLine21Reader line_;
};

}  // namespace

std::string qvCcText(std::span<const QvCcBytePair> pairs, int type) {
    Reader reader(type == QvCcBytePair::field2);
    for (const auto& pair : pairs)
        if (pair.type() == type && pair.valid()) reader.take(pair.byte1 & 0x7F, pair.byte2 & 0x7F);
    return reader.text();
}
