#include "plugins/av/decoder/filmlength.h"

#include <algorithm>
#include <cmath>
#include <cstring>
#include <vector>

#include "plugins/av/index/packetindex.h"
#include "plugins/av/source/avheaders.h"

namespace av {

namespace {

// Containers whose header states the length of the film. Most are written by the clock of one stream, so
// that the others may end a little earlier; some count samples.
struct Stated {
    const char* format;
    double share, seconds;  // by which the film may be shorter
};
constexpr Stated stated[] = {{"matroska", 0.01, 1}, {"avi", 0.01, 1}, {"mxf", 0.01, 1}, {"mp3", 0.01, 1},
                             {"flac", 0, 0.1},      {"aiff", 0, 0.1}, {"au", 0, 0.1}};

}  // namespace

FilmLength::FilmLength(const AVFormatContext& container, const PacketIndex& index, long long bytes,
                       const FileExtent& extent)
    : container_(container),
      index_(index),
      bytes_(bytes),
      extent_(extent),
      cut_(!index.damage().empty() || endsEarly()) {}

// The library has several names for one format.
bool FilmLength::is(const char* format) const { return av_match_name(format, container_.iformat->name) > 0; }

// Announced for a stream; 0 for unknown.
double FilmLength::seconds(const AVStream& stream) const {
    // Of AVI the library has a length that fits to the size of the file.
    const bool pictures = stream.codecpar->codec_type == AVMEDIA_TYPE_VIDEO;
    if (is("avi") && pictures && stream.nb_frames > 0)
        return static_cast<double>(stream.nb_frames) * av_q2d(stream.time_base);
    if (stream.duration != AV_NOPTS_VALUE)
        return static_cast<double>(stream.duration) * av_q2d(stream.time_base);
    if (const double tagged = taggedSeconds(stream); tagged > 0) return tagged;
    if (container_.duration != AV_NOPTS_VALUE) return static_cast<double>(container_.duration) / AV_TIME_BASE;
    return 0;
}

// Of Matroska the header has the length of the longest stream, and a tag that of each. 0 for unknown.
double FilmLength::taggedSeconds(const AVStream& stream) const {
    const AVDictionaryEntry* const tag =
        is("matroska") ? av_dict_get(stream.metadata, "DURATION", nullptr, 0) : nullptr;
    std::int64_t microseconds = 0;
    if (!tag || av_parse_time(&microseconds, tag->value, 1) < 0 || microseconds > container_.duration)
        return 0;
    return static_cast<double>(microseconds) / AV_TIME_BASE;
}

// Seconds from the first packet to the end of the last one; from 0 where the first is later, because then
// some writers count the time before it, too.
double FilmLength::present() const {
    double first = 0, last = 0;
    bool any = false;
    for (unsigned i = 0; i < container_.nb_streams; ++i) {
        const double unit = av_q2d(container_.streams[i]->time_base);
        for (const IndexedPacket& packet : index_.packets(static_cast<int>(i))) {
            const std::int64_t time = packet.pts != AV_NOPTS_VALUE ? packet.pts : packet.dts;
            if (time == AV_NOPTS_VALUE) continue;
            const double start = static_cast<double>(time) * unit;
            first = any ? std::min(first, start) : start;
            last = std::max(any ? last : start, start + packet.duration * unit);
            any = true;
        }
    }
    return any ? last - std::min(first, 0.0) : 0;
}

bool FilmLength::endsEarly() const {
    if (index_.isPartial()) return false;
    const auto* const row =
        std::find_if(std::begin(stated), std::end(stated), [&](const Stated& one) { return is(one.format); });
    if (row == std::end(stated) || container_.duration == AV_NOPTS_VALUE) return false;
    if (container_.duration_estimation_method != AVFMT_DURATION_FROM_STREAM) return false;
    double length = static_cast<double>(container_.duration) / AV_TIME_BASE;
    for (unsigned i = 0; i < container_.nb_streams; ++i)
        if (container_.streams[i]->codecpar->codec_type == AVMEDIA_TYPE_VIDEO)
            length = std::max(length, seconds(*container_.streams[i]));
    const double there = present();
    return there > 0 && length > there * (1 + row->share) + row->seconds;
}

// Containers of tables of samples say how many packets there are. Of those in fragments the library has the
// tables of all fragments that it has seen.
long long FilmLength::missingPackets(const AVStream& stream) const {
    if (!is("mp4")) return 0;
    const auto there = static_cast<long long>(index_.packets(stream.index).size());
    const long long listed = avformat_index_get_entries_count(&stream);
    return std::max<long long>({listed - there, stream.nb_frames - there, 0});
}

// Uncompressed pictures lie one after the other to the end of the file.
bool FilmLength::endsWithinPicture(const AVStream& stream) const {
    const auto& packets = index_.packets(stream.index);
    if (!is("yuv4mpegpipe") || packets.size() < 2) return false;
    const std::int64_t stride = packets[1].position - packets[0].position;
    return stride > 0 && packets.back().position + stride < bytes_;
}

// Where the library fits the length to the size of the file, but keeps the number.
long long FilmLength::announcedSamples(const AVStream& stream) const {
    const bool plain = av_get_bits_per_sample(stream.codecpar->codec_id) > 0;
    if (is("w64") && plain && extent_.bytes > bytes_ && stream.codecpar->block_align > 0)
        return std::max<std::int64_t>(stream.duration, 0) +
               (extent_.bytes - bytes_) / stream.codecpar->block_align;
    return is("caf") && plain ? stream.nb_frames : 0;
}

// The usual step between two pictures says how many are missing in one that is longer.
long long FilmLength::lost(const AVStream& stream) const {
    if (!extent_.broken && extent_.bytes <= bytes_) return 0;
    std::vector<std::int64_t> times;
    for (const IndexedPacket& packet : index_.packets(stream.index))
        if (packet.pts != AV_NOPTS_VALUE) times.push_back(packet.pts);
    if (times.size() < 3) return 0;
    std::sort(times.begin(), times.end());
    std::vector<std::int64_t> steps;
    for (std::size_t i = 1; i < times.size(); ++i) steps.push_back(times[i] - times[i - 1]);
    std::vector<std::int64_t> sorted = steps;
    const auto middle = sorted.begin() + static_cast<std::ptrdiff_t>(sorted.size() / 2);
    std::nth_element(sorted.begin(), middle, sorted.end());
    const std::int64_t usual = std::max<std::int64_t>(*middle, 1);
    long long lost = 0;
    for (const std::int64_t step : steps)
        if (step > 2 * usual) lost += (step + usual / 2) / usual - 1;
    return lost;
}

bool FilmLength::isCut(const AVStream& stream) const {
    // The header allows for a shorter stream, its own tag doesn't.
    const bool endMissing = extent_.bytes > bytes_ && taggedSeconds(stream) > 0;
    return cut_ || endMissing || missingPackets(stream) > 0 || endsWithinPicture(stream) ||
           announcedSamples(stream) > 0;
}

long long FilmLength::announced(const AVStream& stream, double rate, long long present, double start) const {
    double units = seconds(stream) * rate;
    // Some writers of Matroska count the time before the first picture, others don't.
    if (is("matroska") && start > 0 && units - start * rate >= static_cast<double>(present))
        units -= start * rate;
    long long whole = units > 0 && units < 1e15 ? std::llround(units) : 0;
    whole = std::max(whole, announcedSamples(stream));
    const bool pictures = stream.codecpar->codec_type == AVMEDIA_TYPE_VIDEO;
    if (pictures && whole <= present) whole = present + missingPackets(stream) + endsWithinPicture(stream);
    return whole;
}

}  // namespace av
