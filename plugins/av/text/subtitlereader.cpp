#include "plugins/av/text/subtitlereader.h"

#include <algorithm>
#include <vector>

#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/limits.h"
#include "plugins/av/text/eventtext.h"

namespace av {

namespace {

constexpr std::int64_t timescale = MediaTime::defaultTimescale;
constexpr std::int64_t longestOpen = 4 * timescale;  // of one whose end the container does not say
constexpr std::uint32_t emptyOfQuickTime = 2;        // bytes: a length of 0

constexpr struct {
    AVCodecID id;
    const char* name;
} kinds[] = {
    {AV_CODEC_ID_SUBRIP, "SubRip"},      {AV_CODEC_ID_ASS, "ASS"},   {AV_CODEC_ID_SSA, "SSA"},
    {AV_CODEC_ID_MOV_TEXT, "QuickTime"}, {AV_CODEC_ID_TEXT, "text"}, {AV_CODEC_ID_WEBVTT, "WebVTT"},
};

struct FreeSubtitle {
    void operator()(AVSubtitle* subtitle) const { avsubtitle_free(subtitle); }
};

// The texts of a packet, one after the other; false for what is damaged.
bool textOf(AVCodecContext& codec, AVPacket& packet, std::string& text) {
    AVSubtitle subtitle{};
    int got = 0;
    const int result = avcodec_decode_subtitle2(&codec, &subtitle, &got, &packet);
    const std::unique_ptr<AVSubtitle, FreeSubtitle> release(&subtitle);
    if (result < 0) return false;
    for (unsigned i = 0; got && i < subtitle.num_rects; ++i) {
        if (!subtitle.rects[i]->ass) continue;
        if (!text.empty()) text += '|';
        text += textOfEvent(subtitle.rects[i]->ass);
    }
    return true;
}

CodecPtr openCodec(const AVStream& stream, std::string& reason) {
    const AVCodec* const decoder = avcodec_find_decoder(stream.codecpar->codec_id);
    CodecPtr codec(decoder ? avcodec_alloc_context3(decoder) : nullptr);
    int result = codec ? avcodec_parameters_to_context(codec.get(), stream.codecpar) : AVERROR(ENOMEM);
    if (codec) codec->pkt_timebase = stream.time_base;
    if (result >= 0) result = avcodec_open2(codec.get(), decoder, nullptr);
    if (!decoder) reason = "there is no decoder for its subtitles";
    if (decoder && result < 0) reason = "its subtitles can't be decoded (" + errorText(result) + ")";
    return decoder && result >= 0 ? std::move(codec) : nullptr;
}

}  // namespace

bool SubtitleReader::isText(const AVStream& stream) {
    return std::any_of(std::begin(kinds), std::end(kinds),
                       [&](const auto& kind) { return kind.id == stream.codecpar->codec_id; });
}

const char* SubtitleReader::codecName(const AVStream& stream) {
    for (const auto& kind : kinds)
        if (kind.id == stream.codecpar->codec_id) return kind.name;
    return "";
}

SubtitleReader::SubtitleReader(const MediaBytes& bytes, const std::string& format, const AVStream& stream,
                               std::shared_ptr<const PacketIndex> index, std::int64_t zero,
                               std::int64_t zeroBase)
    : bytes_(bytes),
      format_(format),
      stream_(stream.index),
      index_(std::move(index)),
      num_(std::max(stream.time_base.num, 1)),
      den_(std::max(stream.time_base.den, 1)),
      origin_(std::clamp(av_rescale(zero, timescale, std::max<std::int64_t>(zeroBase, 1)), -limits::farthest,
                         limits::farthest)) {
    const auto& packets = index_->packets(stream_);
    for (std::size_t i = 0; i < packets.size(); ++i) {
        const MediaTime end = endOf(i);
        if (isEmpty(packets[i]) || end <= MediaTime(0, timescale)) continue;
        const MediaTime start = time(packets[i].pts);
        first_ = count_ == 0 ? start : std::min(first_, start);
        last_ = count_ == 0 ? start : std::max(last_, start);
        end_ = count_ == 0 ? end : std::max(end_, end);
        ++count_;
    }
}

// QuickTime has packets without text for the time between two subtitles.
bool SubtitleReader::isEmpty(const IndexedPacket& packet) const {
    return packet.pts == AV_NOPTS_VALUE || packet.bytes <= emptyOfQuickTime;
}

MediaTime SubtitleReader::time(std::int64_t pts) const {
    const std::int64_t ticks = av_rescale(pts, num_ * timescale, den_);
    const std::int64_t known = ticks == INT64_MIN ? origin_ : std::min(ticks, limits::farthest);
    return MediaTime(std::max<std::int64_t>(known - origin_, 0), timescale);
}

MediaTime SubtitleReader::endOf(std::size_t packet) const {
    const auto& packets = index_->packets(stream_);
    const IndexedPacket& row = packets[packet];
    if (row.pts == AV_NOPTS_VALUE) return MediaTime(0, timescale);
    if (row.duration > 0) return time(row.pts + row.duration);
    const MediaTime latest = time(row.pts) + MediaTime(longestOpen, timescale);
    const bool follows = packet + 1 < packets.size() && packets[packet + 1].pts > row.pts;
    return follows ? std::min(latest, time(packets[packet + 1].pts)) : latest;
}

// Fills read_; false with failure().
bool SubtitleReader::readAll() {
    const auto& packets = index_->packets(stream_);
    std::size_t bytes = 0;
    for (const IndexedPacket& row : packets) bytes += row.bytes;
    if (bytes > limits::subtitleBytes) {
        failure_ = "its subtitles are larger than any text";
        return false;
    }
    const auto input = MediaInput::open(bytes_, format_, failure_);
    if (!input) return false;
    const CodecPtr codec = openCodec(*input->context().streams[stream_], failure_);
    const PacketPtr packet(av_packet_alloc());
    if (!codec || !packet) return false;
    input->selectOnly(stream_);
    struct Entry {
        MediaTime start, end;
        std::string text;
    };
    std::vector<Entry> entries;
    for (std::size_t i = 0; i < packets.size() && input->read(*packet) == MediaInput::Read::packet; ++i) {
        Entry entry{time(packets[i].pts), endOf(i), ""};
        const bool shown = !isEmpty(packets[i]) && entry.end > MediaTime(0, timescale);
        if (shown && !textOf(*codec, *packet, entry.text)) ++lost_;
        av_packet_unref(packet.get());
        if (shown && !entry.text.empty()) entries.push_back(std::move(entry));
    }
    std::stable_sort(entries.begin(), entries.end(),
                     [](const Entry& a, const Entry& b) { return a.start < b.start; });
    for (const Entry& entry : entries) read_->append(entry.text, entry.start, entry.end);
    return true;
}

QvSubtitles& SubtitleReader::subtitles() {
    if (read_) return *read_;
    read_ = std::make_unique<QvSubtitles>();
    readAll();
    return *read_;
}

AnyVector SubtitleReader::entries() {
    AnyVector all;
    const QvSubtitles& texts = subtitles();
    for (int i = 0; i < texts.nrSubtitles(); ++i) {
        const QvSubtitle& one = *texts.at(i);
        all.append(Any(AnyDict("start", one.start, "end", one.end, "text", one.text)));
    }
    return all;
}

}  // namespace av
