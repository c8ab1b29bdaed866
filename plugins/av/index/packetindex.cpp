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

// Packets that are read before a table is believed, of all streams: enough to see in which way times of
// presentation differ from those of decoding.
constexpr std::size_t enoughRead = 256;

// Packets, or bytes, that show the rate of pictures where the film's header states its length.
constexpr std::size_t enoughForRate = 4096;
constexpr std::int64_t enoughBytes = 32 << 20;

bool statesLength(const AVFormatContext& container) {
    return av_match_name("matroska", container.iformat->name) > 0 && container.duration > 0 &&
           container.duration_estimation_method == AVFMT_DURATION_FROM_STREAM;
}

IndexedPacket tabled(const AVIndexEntry& entry, std::int64_t time) {
    IndexedPacket row{time, entry.timestamp, entry.pos, 0, 0, 0, 0, static_cast<std::uint32_t>(entry.size)};
    if (entry.flags & AVINDEX_KEYFRAME) row.flags |= AV_PKT_FLAG_KEY;
    if (entry.flags & AVINDEX_DISCARD_FRAME) row.flags |= AV_PKT_FLAG_DISCARD;
    return row;
}

// The table of a stream as packets: those that were read, and the others with times that follow from these.
// Nothing where the table and what was read differ, or where times don't follow.
std::vector<IndexedPacket> rowsOf(AVStream& stream, const std::vector<IndexedPacket>& read, long long bytes) {
    const int count = avformat_index_get_entries_count(&stream);
    const bool pictures = stream.codecpar->codec_type == AVMEDIA_TYPE_VIDEO;
    if (count < static_cast<int>(read.size()) || (pictures && read.empty())) return {};
    std::vector<IndexedPacket> rows;
    rows.reserve(static_cast<std::size_t>(count));
    bool discards = false;
    for (int i = 0; i < count; ++i) {
        const AVIndexEntry& entry = *avformat_index_get_entry(&stream, i);
        if (entry.size < 0 || entry.pos < 0 || entry.pos > bytes - entry.size) return {};
        rows.push_back(tabled(entry, entry.timestamp));
        discards = discards || (entry.flags & AVINDEX_DISCARD_FRAME) != 0;
        if (i == 0) continue;
        auto& before = rows[rows.size() - 2];
        const std::int64_t step = entry.timestamp - before.dts;
        if (step < 0 || step > UINT_MAX) return {};
        before.duration = static_cast<std::uint32_t>(step);
    }
    IndexedPacket& last = rows.back();
    if (stream.duration > last.dts && stream.duration - last.dts < UINT_MAX)
        last.duration = static_cast<std::uint32_t>(stream.duration - last.dts);
    else if (rows.size() > 1)
        last.duration = rows[rows.size() - 2].duration;
    std::int64_t first = INT64_MAX;
    bool moved = false;
    for (std::size_t i = 0; i < read.size(); ++i) {
        if (read[i].position != rows[i].position || read[i].pts == AV_NOPTS_VALUE) return {};
        first = std::min(first, read[i].pts);
        moved = moved || read[i].pts != rows[i].dts;
    }
    if (!moved) {
        std::copy(read.begin(), read.end(), rows.begin());
        return rows;
    }
    // Pictures that are decoded in another order: at equal steps they have the times of decoding, moved.
    const std::int64_t step = rows.front().duration, shift = first - rows.front().dts;
    const auto isEqual = [step](const IndexedPacket& row) { return row.duration == step; };
    const auto fits = [&](const IndexedPacket& row) { return (row.pts - first) % step == 0; };
    if (step <= 0 || discards || !pictures || !std::all_of(rows.begin(), rows.end() - 1, isEqual) ||
        !std::all_of(read.begin(), read.end(), fits))
        return {};
    for (IndexedPacket& row : rows) row.pts = row.dts + shift;
    return rows;
}

}  // namespace

// Takes what is missing from the tables, if they have it for all streams.
bool PacketIndex::continueByTable(const AVFormatContext& container, std::vector<PacketSamples>& samples,
                                  long long bytes) {
    std::vector<std::vector<IndexedPacket>> all;
    std::size_t count = 0;
    for (unsigned i = 0; i < container.nb_streams; ++i) {
        AVStream& stream = *container.streams[i];
        const bool any = avformat_index_get_entries_count(&stream) > 0;
        all.push_back(any ? rowsOf(stream, streams_[i], bytes) : streams_[i]);
        if (any && all.back().empty()) return false;
        count += all.back().size();
    }
    if (count > limits::packets) return false;
    const PacketPtr packet(av_packet_alloc());
    if (!packet) return false;
    for (unsigned i = 0; i < container.nb_streams; ++i) {
        if (container.streams[i]->codecpar->codec_type != AVMEDIA_TYPE_AUDIO) continue;
        for (std::size_t row = streams_[i].size(); row < all[i].size(); ++row) {
            packet->size = static_cast<int>(all[i][row].bytes);
            all[i][row].samples = samples[i].next(*packet);
        }
    }
    streams_ = std::move(all);
    return true;
}

// Whether what was read of all streams says what they are, and none of them has to be decoded to be counted.
// False also where packets come after the end that the header states.
bool PacketIndex::showsStreams(const AVFormatContext& container) const {
    for (unsigned i = 0; i < container.nb_streams; ++i) {
        const AVMediaType type = container.streams[i]->codecpar->codec_type;
        const bool sound = type == AVMEDIA_TYPE_AUDIO;
        const bool cover = (container.streams[i]->disposition & AV_DISPOSITION_ATTACHED_PIC) != 0;
        if (cover || (!sound && type != AVMEDIA_TYPE_VIDEO)) continue;
        const AVRational base = container.streams[i]->time_base;
        const auto counts = [&](const IndexedPacket& packet) {
            return packet.pts != AV_NOPTS_VALUE && (!sound || packet.samples != unknownSamples) &&
                   av_compare_ts(packet.pts, base, container.duration, AV_TIME_BASE_Q) <= 0;
        };
        if (streams_[i].size() < 2 || !std::all_of(streams_[i].begin(), streams_[i].end(), counts))
            return false;
    }
    return true;
}

std::unique_ptr<PacketIndex> PacketIndex::build(MediaInput& input, std::string& reason, From from) {
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
    const bool tables = from != From::packets && input.leaveBytes();
    bool shortly = from == From::survey && statesLength(container);
    std::size_t count = 0;
    std::int64_t bytes = 0;
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
        bytes += packet->size;
        av_packet_unref(packet.get());
        if (++count > limits::packets) {
            reason = tooMany;
            return nullptr;
        }
        if (tables && from == From::survey && count == enoughRead &&
            index->continueByTable(container, samples, input.size()))
            break;
        if (shortly && (count == enoughForRate || (bytes >= enoughBytes && count >= enoughRead))) {
            index->partial_ = index->showsStreams(container);
            if (index->partial_) break;
            shortly = false;
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
