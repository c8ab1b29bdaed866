// The packets of every stream, in decoding order, from one pass of demultiplexing without decoding. What is
// exact before a run comes from here: the number of pictures and samples, and where decoding starts for one.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "plugins/av/index/packetsamples.h"
#include "plugins/av/source/mediainput.h"

struct AVFormatContext;

namespace av {

struct IndexedPacket {
    std::int64_t pts, dts;                 // in the stream's time base; AV_NOPTS_VALUE for none
    std::int64_t position;                 // byte in the file; -1 for none
    std::uint32_t duration;                // in the time base; 0 where the container doesn't say
    std::uint32_t flags;                   // of the library (AV_PKT_FLAG_...), and `skipped`
    std::uint32_t skipAtStart, skipAtEnd;  // samples that the container says are priming or padding
    std::uint32_t bytes = 0;
    std::uint32_t samples =
        unknownSamples;  // of sound: what it decodes to, if that is known without decoding

    bool key() const { return (flags & 1u) != 0; }
};
static_assert(sizeof(IndexedPacket) <= 48, "aim: 64 bytes a packet with what its reader adds");

class PacketIndex {
  public:
    static constexpr const char* tooMany = "it has more packets than can be indexed";  // a reason

    enum class From {
        packets,  // all are read
        table,    // the same, without their bytes where the container's tables say all
        survey,  // the table itself where it has all packets: as many as there are, from the first time on to
                 // the last, but which packet has which time is not known. For counting only. Of Matroska,
                 // which has no such table, the first packets where its header states the film's length.
    };
    // Reads `input` from its start to its end, all streams, and rewinds it. What a damaged file has up to its
    // damage is kept: damage() says what happened. Null with `reason` when there is not even a packet, or
    // more than the limits allow.
    static std::unique_ptr<PacketIndex> build(MediaInput& input, std::string& reason,
                                              From from = From::table);

    const std::vector<IndexedPacket>& packets(int stream) const {
        return streams_[static_cast<unsigned>(stream)];
    }
    // The packet from which decoding has to start so that the one at `wanted` comes out as it does when the
    // stream is decoded from its start: a key packet at or before it, with `preroll` packets before that for
    // codecs that need them.
    std::size_t startFor(int stream, std::size_t wanted, std::size_t preroll) const;

    PacketKey keyOf(int stream, std::size_t packet) const;

    const std::string& damage() const { return damage_; }  // "" for none; else a part of a sentence
    bool isPartial() const { return partial_; }            // of a survey: more packets follow

  private:
    bool continueByTable(const AVFormatContext& container, std::vector<PacketSamples>& samples,
                         long long bytes);
    bool showsStreams(const AVFormatContext& container) const;

    std::vector<std::vector<IndexedPacket>> streams_;
    std::string damage_;
    bool partial_ = false;
};

}  // namespace av
