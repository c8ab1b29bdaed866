#include "plugins/av/index/packetindex.h"

#include <algorithm>
#include <climits>

#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

IndexedPacket indexed(const AVPacket& packet) {
    const auto duration = static_cast<std::uint32_t>(std::clamp<std::int64_t>(packet.duration, 0, UINT_MAX));
    IndexedPacket row{packet.pts,
                      packet.dts,
                      packet.pos,
                      duration,
                      static_cast<std::uint32_t>(packet.flags),
                      0,
                      0,
                      static_cast<std::uint32_t>(packet.size)};
    std::size_t bytes = 0;
    const auto* skip = av_packet_get_side_data(&packet, AV_PKT_DATA_SKIP_SAMPLES, &bytes);
    if (skip && bytes >= 8) {
        const auto number = [skip](int at) {
            return std::uint32_t{skip[at]} | std::uint32_t{skip[at + 1]} << 8 |
                   std::uint32_t{skip[at + 2]} << 16 | std::uint32_t{skip[at + 3]} << 24;
        };
        row.skipAtStart = number(0);
        row.skipAtEnd = number(4);
    }
    return row;
}

}  // namespace

std::unique_ptr<PacketIndex> PacketIndex::build(MediaInput& input, std::string& reason, bool whole) {
    auto index = std::make_unique<PacketIndex>();
    const AVFormatContext& container = input.context();
    index->streams_.resize(container.nb_streams);
    std::vector<PacketSamples> samples;
    for (unsigned i = 0; i < container.nb_streams; ++i) samples.emplace_back(*container.streams[i]->codecpar);
    const PacketPtr packet(av_packet_alloc());
    if (!packet) {
        reason = "out of memory";
        return nullptr;
    }
    if (!whole) input.leaveBytes();
    std::size_t count = 0;
    for (;;) {
        const MediaInput::Read result = input.read(*packet);
        if (result == MediaInput::Read::failed) index->damage_ = input.failure();
        if (result != MediaInput::Read::packet) break;
        // Streams that appear later than the probe found them are none of this film's.
        const auto stream = static_cast<std::size_t>(packet->stream_index);
        if (stream < index->streams_.size()) {
            index->streams_[stream].push_back(indexed(*packet));
            if (container.streams[stream]->codecpar->codec_type == AVMEDIA_TYPE_AUDIO)
                index->streams_[stream].back().samples = samples[stream].next(*packet);
        }
        av_packet_unref(packet.get());
        if (++count > limits::packets) {
            reason = tooMany;
            return nullptr;
        }
    }
    if (count == 0) {
        reason = index->damage_.empty() ? "it is empty" : index->damage_;
        return nullptr;
    }
    if (input.rewind()) return index;
    reason = input.failure();
    return nullptr;
}

std::size_t PacketIndex::startFor(int stream, std::size_t wanted, std::size_t preroll) const {
    const auto& all = packets(stream);
    std::size_t start = std::min(wanted, all.size());
    while (start > 0 && (start >= all.size() || !all[start].key())) --start;
    return start - std::min(start, preroll);
}

PacketKey PacketIndex::keyOf(int stream, std::size_t packet) const {
    const auto& all = packets(stream);
    const IndexedPacket& wanted = all[packet];
    std::uint32_t ordinal = 0;
    if (wanted.position < 0) return {wanted.pts, wanted.dts, wanted.position};
    while (packet > ordinal && all[packet - ordinal - 1].position == wanted.position) ++ordinal;
    return {wanted.pts, wanted.dts, wanted.position, ordinal};
}

}  // namespace av
