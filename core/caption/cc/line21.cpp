#include "core/caption/cc/line21_p.h"

namespace {

QvLine21Code::Kind kindOf(int first, int second) {
    if (second >= 0x40) return QvLine21Code::address;
    if (first == 1 && second >= 0x30) return QvLine21Code::special;
    if (first == 1 && second >= 0x20) return QvLine21Code::style;
    if ((first == 2 || first == 3) && second >= 0x20) return QvLine21Code::extended;
    if (first == 7 && second >= 0x21 && second <= 0x23) return QvLine21Code::tab;
    return first == 4 || first == 5 ? QvLine21Code::command : QvLine21Code::unknown;
}

}  // namespace

QvLine21Code QvLine21Reader::take(int first, int second) {
    if (first >= 0x10 && first < 0x20) {
        inService_ = false;
        const int control = first << 8 | second;
        const bool again = control == lastControl_;
        lastControl_ = again ? 0 : control;
        if (again) return {};
        return {kindOf(first & 7, second), first & 7, second, (first & 8) != 0};
    }
    lastControl_ = 0;
    if (hasServices_ && first != 0 && first < 0x10) {  // start, continue or, with 0x0F, end
        inService_ = first != 0x0F;
        return {};
    }
    if (inService_) return {};
    return {QvLine21Code::characters, first, second};
}
