#include "plugins/av/mux/filmcheck.h"

#include <algorithm>
#include <cstring>

#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/mediainput.h"

namespace av {

namespace {

// Containers whose table of samples has every unit.
bool countsUnits(const AVFormatContext& film) { return std::strstr(film.iformat->name, "mp4") != nullptr; }

// A short film may be too little to be recognised. The readers of some containers have other names.
std::string readerOf(const std::string& format) {
    if (format == "mp4") return "mov";
    if (format == "webm") return "matroska";
    return format == "vob" ? "mpeg" : format;
}

// The units of each stream.
bool count(MediaInput& film, std::vector<long long>& counts) {
    const PacketPtr packet(av_packet_alloc());
    if (!packet) return false;
    std::fill(counts.begin(), counts.end(), 0);
    MediaInput::Read read;
    while ((read = film.read(*packet)) == MediaInput::Read::packet) {
        const auto stream = static_cast<std::size_t>(packet->stream_index);
        if (stream < counts.size()) ++counts[stream];
        av_packet_unref(packet.get());
    }
    return read == MediaInput::Read::end;
}

}  // namespace

std::string checkFilm(const Any& file, const char* format, const std::vector<FilmExpectation>& streams,
                      bool fragments) {
    std::string reason;
    const MediaBytes bytes(file);
    const auto film = MediaInput::open(bytes, readerOf(format), reason);
    if (!film) return reason;
    const AVFormatContext& context = film->context();
    std::vector<long long> counts(context.nb_streams);
    for (unsigned i = 0; i < context.nb_streams; ++i) counts[i] = context.streams[i]->nb_frames;
    if (fragments && !count(*film, counts)) return film->failure();
    for (const bool video : {true, false}) {
        unsigned at = 0;
        for (const FilmExpectation& expected : streams) {
            if (expected.video != video) continue;
            const AVMediaType type = video ? AVMEDIA_TYPE_VIDEO : AVMEDIA_TYPE_AUDIO;
            while (at < context.nb_streams && context.streams[at]->codecpar->codec_type != type) ++at;
            if (at == context.nb_streams)
                return expected.units == 0
                           ? ""
                           : std::string("a stream of ") + (video ? "pictures" : "sound") + " is missing";
            const long long found = counts[at++];
            // Sound of one size a sample is counted in samples.
            if (video && countsUnits(context) && (found > 0 || fragments) && found != expected.units)
                return "it has " + std::to_string(found) + " of " + std::to_string(expected.units) +
                       " pictures";
        }
    }
    return "";
}

}  // namespace av
