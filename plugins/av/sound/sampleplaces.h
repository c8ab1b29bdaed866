// Where the samples of each packet lie in the film.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <vector>

#include "plugins/av/index/packetindex.h"

namespace av {

struct SoundClock {
    std::int64_t num = 0, den = 1;  // of the packets' times: seconds of one unit
    int samplerate = 0;             // Hz
    bool hasZero = false;           // false: the first sample is the film's first
    std::int64_t zero = 0;          // sample of the stream's own clock that is the film's first
};

struct Priming {
    bool trim = false;          // false: the codec cuts priming and padding
    unsigned scale = 1;         // the container states priming in units of this many samples
    std::uint32_t initial = 0;  // samples that the codec's own header states, unless the first packet does
};

class SamplePlaces {
  public:
    struct Place {
        long long start;      // in the film, of the first sample that is kept; may be negative
        std::uint32_t front;  // samples of the packet before it, which are priming
        std::uint32_t kept;
    };

    // `counts`: what each packet decodes to. Priming and padding are taken off it.
    // Gaps in the times become gaps of the places, overlaps and jumps of the clock do not.
    void set(std::span<const IndexedPacket> packets, std::span<const std::uint32_t> counts,
             const Priming& priming, const SoundClock& clock);

    std::size_t packets() const { return places_.size(); }
    const Place& of(std::size_t packet) const { return places_[packet]; }
    long long samples() const { return samples_; }  // of the film, from its sample 0 to the last of these
    // The first packet that reaches beyond that sample; packets() for none.
    std::size_t packetAt(long long sample) const;

  private:
    std::vector<Place> places_;
    long long samples_ = 0;

    void trim(std::span<const IndexedPacket> packets, const Priming& priming);
};

}  // namespace av
