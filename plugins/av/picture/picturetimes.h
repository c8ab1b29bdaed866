// Which pictures of a stream are presented when: from the times of its packets to a constant rate.
#pragma once

#include <cstdint>
#include <vector>

#include "core/measure/qvratio.h"
#include "plugins/av/index/packetindex.h"

namespace av {

struct Rational {
    std::int64_t num = 0, den = 1;
};

// One coded picture, in the order of presentation.
struct TimedPicture {
    std::int64_t time;   // in units of the time base
    std::size_t packet;  // its number in the index
};

// The packets that are presented, sorted by their times. The time of one that has only a time of decoding
// follows from the packets after it. A step of the clock between two packets that is longer than
// `longestStep`, either way, is taken out.
std::vector<TimedPicture> presentedPictures(const std::vector<IndexedPacket>& packets,
                                            std::int64_t usualDuration, std::int64_t longestStep);

struct PicturePlan {
    QvRatio rate{25, 1};
    bool variable = false;
    // Of frame n, the picture that it shows. Empty for a constant rate without holes: frame n shows picture
    // n.
    std::vector<std::uint32_t> shown;
    int frames = 0;
};
// `base`: seconds of a unit of time. `hints`: rates that the container and the codec state, best first; 0 for
// none. `lastDuration` of the last picture, in units; 0: unknown. `holes`: pictures are missing because the
// file is damaged; then a stated rate is constant if all times are frames of it, and the picture before a
// hole stays.
PicturePlan planPictures(const std::vector<TimedPicture>& pictures, Rational base,
                         const std::vector<Rational>& hints, std::int64_t lastDuration, bool holes = false);

}  // namespace av
