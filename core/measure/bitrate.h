// A bit rate and the way an encoder is to keep it.
#pragma once

#include "core/arch/api.h"

class Any;

// min, max and target are bits a second. What counts depends on the type:
//
//   cbr              target
//   vbr              target, min, max, mode (255: no maximum is given)
//   cqt, cqtStrict   mode
//   quality          min, max, mode
class QV_API QvBitrate {
  public:
    enum Type { cbr = 0, vbr = 1, cqt = 2, cqtStrict = 3, quality = 4 };
    static constexpr int noMaximum = 255;  // a mode of vbr

    int type = cbr;
    int mode = 0;
    int min = 0;
    int max = 0;
    int target = 0;

    constexpr QvBitrate() = default;
    // Note the order: it is not that of the members.
    explicit constexpr QvBitrate(int typeIs, int targetIs = 0, int minIs = 0, int maxIs = 0, int modeIs = 0)
        : type(typeIs), mode(modeIs), min(minIs), max(maxIs), target(targetIs) {}

    // Types must agree; then cbr compares target, cqt and cqtStrict mode, all others min, max and mode: two
    // variable rates with different targets are equal.
    bool operator==(const QvBitrate& other) const;

    // As in "VBR, 4000kbps (max 8000kbps)".
    Any desc() const;
};
