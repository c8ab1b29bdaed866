#include "core/media/bitrate.h"

#include "core/value/any.h"

bool QvBitrate::operator==(const QvBitrate& other) const {
    if (type != other.type) return false;
    switch (type) {
        case cbr: return target == other.target;
        case cqt:
        case cqtStrict: return mode == other.mode;
        default: return min == other.min && max == other.max && mode == other.mode;
    }
}

Any QvBitrate::desc() const {
    switch (type) {
        case cbr: return Any::sprintf("CBR, %dkbps", target / 1000);
        case vbr:
            if (mode == noMaximum) return Any::sprintf("VBR, %dkbps (max N/A)", target / 1000);
            return Any::sprintf("VBR, %dkbps (max %dkbps)", target / 1000, max / 1000);
        case cqt: return Any("CQT");
        case cqtStrict: return Any("CQT Strict");
        case quality: return Any("Constant Quality");
        default: return Any("Beats me");
    }
}
