#include "plugins/av/sound/sampleplaces.h"

#include <algorithm>
#include <cstdlib>

#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/limits.h"

namespace av {

// Priming may be longer than a packet: then it goes on in the next one.
void SamplePlaces::trim(std::span<const IndexedPacket> packets, const Priming& priming) {
    std::uint32_t left = priming.initial;
    for (std::size_t i = 0; i < places_.size(); ++i) {
        const IndexedPacket& packet = packets[i];
        Place& place = places_[i];
        if (packet.skipAtStart || packet.skipAtEnd) left = packet.skipAtStart * priming.scale;
        place.front = std::min(left, place.kept);
        left -= place.front;
        place.kept -= place.front;
        if (packet.flags & AV_PKT_FLAG_DISCARD) place.kept = 0;
        if (packet.skipAtEnd <= place.kept) place.kept -= packet.skipAtEnd;
    }
}

void SamplePlaces::set(std::span<const IndexedPacket> packets, std::span<const std::uint32_t> counts,
                       const Priming& priming, const SoundClock& clock) {
    places_.clear();
    places_.reserve(counts.size());
    for (const std::uint32_t count : counts) places_.push_back({0, 0, count});
    if (priming.trim) trim(packets, priming);

    const AVRational base{static_cast<int>(clock.num), static_cast<int>(clock.den)},
        sample{1, clock.samplerate};
    // Containers of coarse or wavering clocks; what is longer is heard as a gap.
    const long long unit = av_rescale_q_rnd(1, base, sample, AV_ROUND_UP);
    const long long tolerance = std::max<long long>(clock.samplerate / 10, 2 * unit);
    // A time of a hostile file may be beyond what can be added to.
    const auto within = [](std::int64_t time) {
        return std::clamp(time, -limits::farthest, limits::farthest);
    };
    long long due = 0, shift = 0, end = 0;
    bool first = true;
    for (std::size_t i = 0; i < places_.size(); ++i) {
        Place& place = places_[i];
        place.start = due;
        if (place.kept == 0) continue;
        const IndexedPacket& packet = packets[i];
        long long at = due;
        if (packet.pts != AV_NOPTS_VALUE) {
            const long long before = priming.trim ? place.front : packet.skipAtStart;
            at = within(av_rescale_q(within(packet.pts), base, sample)) + before - within(clock.zero);
            if (first && !clock.hasZero) shift = -at;
            at += shift;
        }
        if (!first && std::llabs(at - due) <= tolerance) at = due;
        // A jump of the clock is none of the film's silence.
        if (!first && std::llabs(at - due) > 30LL * 60 * 60 * clock.samplerate) {
            shift += due - at;
            at = due;
        }
        place.start = at;
        due = first ? at + place.kept : std::max(due, at + place.kept);
        end = std::max(end, due);
        first = false;
    }
    samples_ = std::max<long long>(end, 0);
}

std::size_t SamplePlaces::packetAt(long long sample) const {
    const auto found = std::partition_point(places_.begin(), places_.end(), [&](const Place& place) {
        return place.start + place.kept <= sample;
    });
    return static_cast<std::size_t>(found - places_.begin());
}

}  // namespace av
