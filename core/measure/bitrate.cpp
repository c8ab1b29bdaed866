#include "core/measure/bitrate.h"

#include "core/arch/formattext_p.h"
#include "core/measure/measuretext_p.h"

bool QvBitrate::operator==(const QvBitrate& other) const {
    if (type != other.type) return false;
    switch (type) {
        case cbr: return target == other.target;
        case cqt:
        case cqtStrict: return mode == other.mode;
        default: return min == other.min && max == other.max && mode == other.mode;
    }
}

std::string qvBitrateText(const QvBitrate& rate) {
    switch (rate.type) {
        case QvBitrate::cbr: return qvShortText("CBR, %dkbps", rate.target / 1000);
        case QvBitrate::vbr:
            if (rate.mode == QvBitrate::noMaximum)
                return qvShortText("VBR, %dkbps (max N/A)", rate.target / 1000);
            return qvShortText("VBR, %dkbps (max %dkbps)", rate.target / 1000, rate.max / 1000);
        case QvBitrate::cqt: return "CQT";
        case QvBitrate::cqtStrict: return "CQT Strict";
        case QvBitrate::quality: return "Constant Quality";
        default: return "Beats me";
    }
}
