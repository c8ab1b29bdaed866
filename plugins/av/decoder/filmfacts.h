// What a film says of itself.
#pragma once

#include <cstdint>

#include "core/value/anycontainer.h"

struct AVCodecParameters;
struct AVFormatContext;

namespace av {

// Where the film begins, on the clock of its container: `time` / `base` seconds. Not known without pictures.
struct FilmZero {
    bool known = false;
    std::int64_t time = 0, base = 1;
};

// Texts under the names that the libraries have for them ("title", "artist", "album", "date", "comment",
// ...); "timecode" and "startTimecode", both the text of the first picture's, "HH:MM:SS:FF", or with ";"
// before the frames where numbers are dropped; "chapters", a Vector of Dicts with "time" (MediaTime from the
// film's start) and, where it has one, "title". What the container lacks is absent.
AnyDict filmFacts(const AVFormatContext& container, const FilmZero& zero);

// Channel of "L", "R", "C", "Ls", "Rs" and "SUB" in the sound; absent where it has none.
AnyDict speakerPlaces(const AVCodecParameters& codec);

}  // namespace av
