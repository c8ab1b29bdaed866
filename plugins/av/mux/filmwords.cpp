#include "plugins/av/mux/filmwords.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <cstring>
#include <new>
#include <vector>

#include "core/measure/mediatime.h"
#include "plugins/av/source/optionlist.h"

namespace av {

namespace {

// Keys of "meta" that have a tag of another name, or one that every kind of tags knows.
constexpr struct {
    const char *key, *tag;
} common[] = {
    {"title", "title"},
    {"artist", "artist"},
    {"album", "album"},
    {"albumArtist", "album_artist"},
    {"album_artist", "album_artist"},
    {"composer", "composer"},
    {"genre", "genre"},
    {"date", "date"},
    {"comment", "comment"},
    {"copyright", "copyright"},
    {"description", "description"},
    {"track", "track"},
};
// Names that describe the source and not the film.
constexpr const char* ofSource[] = {"clipName", "userClipName", "startTimecode", "codec", "language"};

std::string textOf(const Any& value) {
    const Any text = value.toString();
    return text.isString() ? text.asString() : "";
}

// As the libraries read it: "2020-01-02T03:04:05Z".
bool isDate(const std::string& text) {
    std::int64_t time = 0;
    return av_parse_time(&time, text.c_str(), 0) >= 0;
}

// Of ISO 6709, "+59.3293+018.0686/", which some containers have as numbers.
bool isPlace(const std::string& text) {
    char* end = nullptr;
    const double latitude = std::strtod(text.c_str(), &end);
    const bool first = end != text.c_str() && (*end == '+' || *end == '-') && std::fabs(latitude) <= 90;
    return first && std::fabs(std::strtod(end, nullptr)) <= 180;
}

double secondsOf(const Any& value) {
    if (value.isMediaTime()) return value.asMediaTime().seconds();
    return value.isInt() || value.isFloat() ? value.toDouble() : -1;
}

// A chapter ends where the next one begins.
bool setChapters(AVFormatContext& film, const AnyVector& chapters, double seconds, double start) {
    constexpr AVRational milliseconds{1, 1000};
    std::vector<std::pair<std::int64_t, std::string>> starts;
    for (const Any& entry : chapters) {
        if (!entry.isDict()) return false;
        const double time = secondsOf(entry.asDict().get("time"));
        if (!(time >= 0) || time > 1e9) return false;
        starts.emplace_back(std::llround((time + start) * 1000), textOf(entry.asDict().get("title")));
    }
    std::sort(starts.begin(), starts.end());
    auto** const list = static_cast<AVChapter**>(av_calloc(starts.size(), sizeof(AVChapter*)));
    if (!list) throw std::bad_alloc();
    film.chapters = list;
    for (std::size_t i = 0; i < starts.size(); ++i) {
        auto* const chapter = static_cast<AVChapter*>(av_mallocz(sizeof(AVChapter)));
        if (!chapter) throw std::bad_alloc();
        list[film.nb_chapters++] = chapter;
        chapter->id = static_cast<std::int64_t>(i) + 1;
        chapter->time_base = milliseconds;
        chapter->start = starts[i].first;
        chapter->end = i + 1 < starts.size()
                           ? starts[i + 1].first
                           : std::max<std::int64_t>(std::llround((seconds + start) * 1000), chapter->start);
        if (!starts[i].second.empty()) setEntry(chapter->metadata, "title", starts[i].second);
    }
    return true;
}

// Numbers are dropped at the rates of NTSC only; elsewhere the libraries refuse such a timecode.
bool dropsNumbers(const AVStream& pictures) {
    const AVRational rate = pictures.avg_frame_rate;
    return rate.den == 1001 && (rate.num + rate.den / 2) / rate.den % 30 == 0;
}

void setTimecode(AVFormatContext& film, std::string timecode) {
    for (unsigned i = 0; i < film.nb_streams; ++i)
        if (film.streams[i]->codecpar->codec_type == AVMEDIA_TYPE_VIDEO && !dropsNumbers(*film.streams[i]))
            std::replace(timecode.begin(), timecode.end(), ';', ':');
    setEntry(film.metadata, "timecode", timecode);
    for (unsigned i = 0; i < film.nb_streams; ++i)
        if (film.streams[i]->codecpar->codec_type == AVMEDIA_TYPE_VIDEO) {
            setEntry(film.streams[i]->metadata, "timecode", timecode);
            break;
        }
}

void setTag(AVFormatContext& film, const Container& container, const char* tag, const std::string& text) {
    const bool title = std::strcmp(tag, "title") == 0;
    const std::string format = container.format;
    const char* const own = !title               ? tag
                            : format == "mpegts" ? "service_name"
                            : format == "mxf"    ? "material_package_name"
                                                 : tag;
    setEntry(film.metadata, own, text);
}

}  // namespace

std::string setFilmWords(AVFormatContext& film, const Container& container, const AnyDict& meta,
                         double seconds, double start) {
    std::string lost;
    const auto lose = [&lost](const char* name) { lost += (lost.empty() ? "" : ", ") + std::string(name); };
    const auto holds = [&container](unsigned word) { return (container.words & word) != 0; };
    for (const auto [key, value] : meta) {
        const auto is = [name = key](const char* other) { return std::strcmp(name, other) == 0; };
        if (std::any_of(std::begin(ofSource), std::end(ofSource), is)) continue;
        if (is("chapters")) {
            if (!value->isVector() || value->asVector().empty()) continue;
            if (!holds(FilmWord::chapters) || !setChapters(film, value->asVector(), seconds, start))
                lose(key);
            continue;
        }
        const std::string text = textOf(*value);
        if (text.empty() || is("timecode")) continue;
        const auto row = std::find_if(std::begin(common), std::end(common),
                                      [&is](const auto& entry) { return is(entry.key); });
        const bool known = row != std::end(common);
        const bool held =
            is("title")           ? holds(FilmWord::title)
            : is("creation_time") ? isDate(text) && holds(FilmWord::creationTime | FilmWord::allTags)
            : is("location")      ? holds(FilmWord::allTags) || (holds(FilmWord::location) && isPlace(text))
                                  : holds(FilmWord::allTags) || (known && holds(FilmWord::commonTags));
        if (held)
            setTag(film, container, known ? row->tag : key, text);
        else
            lose(key);
    }
    std::string timecode = textOf(meta.get("timecode"));
    if (timecode.empty()) timecode = textOf(meta.get("startTimecode"));
    if (!timecode.empty() && holds(FilmWord::timecode)) setTimecode(film, timecode);
    if (!timecode.empty() && !holds(FilmWord::timecode)) lose("timecode");
    return lost;
}

}  // namespace av
