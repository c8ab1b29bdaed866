#include "plugins/av/decoder/filmfacts.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string>

#include "core/measure/mediatime.h"
#include "core/value/any.h"
#include "plugins/av/source/avheaders.h"
#include "plugins/av/source/limits.h"

namespace av {

namespace {

constexpr const char* texts[] = {"title",         "artist",     "album",        "album_artist", "composer",
                                 "genre",         "date",       "track",        "disc",         "show",
                                 "season_number", "episode_id", "episode_sort", "network",      "description",
                                 "synopsis",      "comment",    "copyright",    "publisher",    "performer",
                                 "creation_time", "location",   "make",         "model"};
// What MXF calls them.
constexpr const char* others[][2] = {{"title", "material_package_name"},
                                     {"creation_time", "modification_date"}};
constexpr std::size_t longest = 4000;  // bytes of a text
constexpr unsigned mostChapters = 10000;

std::string text(const AVDictionary* tags, const char* name) {
    const AVDictionaryEntry* const entry = av_dict_get(tags, name, nullptr, 0);
    if (!entry || !entry->value) return "";
    std::string found = entry->value;
    if (found.size() <= longest) return found;
    // Not within a character.
    std::size_t end = longest;
    while (end > 0 && (static_cast<unsigned char>(found[end]) & 0xC0) == 0x80) --end;
    return found.substr(0, end);
}

bool isTimecode(const std::string& text) {
    constexpr const char* form = "00:00:00:00";
    if (text.size() != std::strlen(form)) return false;
    for (std::size_t i = 0; i < text.size(); ++i) {
        const bool digit = text[i] >= '0' && text[i] <= '9';
        if (form[i] == '0' ? !digit : text[i] != ':' && !(i == 8 && (text[i] == ';' || text[i] == '.')))
            return false;
    }
    return true;
}

// Of the container, or of the first stream that has one: a track of timecodes, or the pictures themselves.
std::string timecodeOf(const AVFormatContext& container) {
    std::string found = text(container.metadata, "timecode");
    for (unsigned i = 0; i < container.nb_streams && !isTimecode(found); ++i)
        found = text(container.streams[i]->metadata, "timecode");
    if (!isTimecode(found)) return "";
    if (found[8] == '.') found[8] = ';';
    return found;
}

AnyVector chaptersOf(const AVFormatContext& container, const FilmZero& zero) {
    AnyVector chapters;
    const AVRational unit{1, static_cast<int>(MediaTime::defaultTimescale)};
    const std::int64_t start =
        zero.known ? av_rescale(zero.time, MediaTime::defaultTimescale, std::max<std::int64_t>(zero.base, 1))
                   : 0;
    for (unsigned i = 0; i < std::min(container.nb_chapters, mostChapters); ++i) {
        const AVChapter& chapter = *container.chapters[i];
        if (chapter.time_base.num < 1 || chapter.time_base.den < 1) continue;
        const std::int64_t time = av_rescale_q(chapter.start, chapter.time_base, unit);
        if (std::max(std::llabs(time / 2), std::llabs(start / 2)) > limits::farthest) continue;
        AnyDict entry("time",
                      Any(MediaTime(std::max<std::int64_t>(time - start, 0), MediaTime::defaultTimescale)));
        if (const std::string title = text(chapter.metadata, "title"); !title.empty())
            entry.set("title", Any(title.c_str()));
        chapters.append(Any(entry));
    }
    return chapters;
}

}  // namespace

AnyDict filmFacts(const AVFormatContext& container, const FilmZero& zero) {
    AnyDict facts;
    for (const char* name : texts)
        if (const std::string found = text(container.metadata, name); !found.empty())
            facts.set(name, Any(found.c_str()));
    for (const auto& [name, other] : others)
        if (const std::string found = text(container.metadata, other); !found.empty() && !facts.isSet(name))
            facts.set(name, Any(found.c_str()));
    if (const std::string timecode = timecodeOf(container); !timecode.empty()) {
        facts.set("timecode", Any(timecode.c_str()));
        facts.set("startTimecode", Any(timecode.c_str()));
    }
    if (const AnyVector chapters = chaptersOf(container, zero); !chapters.empty())
        facts.set("chapters", Any(chapters));
    return facts;
}

AnyDict speakerPlaces(const AVCodecParameters& codec) {
    constexpr struct {
        const char* name;
        AVChannel channel, other;
    } speakers[] = {{"L", AV_CHAN_FRONT_LEFT, AV_CHAN_FRONT_LEFT},
                    {"R", AV_CHAN_FRONT_RIGHT, AV_CHAN_FRONT_RIGHT},
                    {"C", AV_CHAN_FRONT_CENTER, AV_CHAN_FRONT_CENTER},
                    {"Ls", AV_CHAN_SIDE_LEFT, AV_CHAN_BACK_LEFT},
                    {"Rs", AV_CHAN_SIDE_RIGHT, AV_CHAN_BACK_RIGHT},
                    {"SUB", AV_CHAN_LOW_FREQUENCY, AV_CHAN_LOW_FREQUENCY}};
    AnyDict places;
    for (const auto& speaker : speakers) {
        int place = av_channel_layout_index_from_channel(&codec.ch_layout, speaker.channel);
        if (place < 0) place = av_channel_layout_index_from_channel(&codec.ch_layout, speaker.other);
        if (place >= 0) places.set(speaker.name, place);
    }
    return places;
}

}  // namespace av
