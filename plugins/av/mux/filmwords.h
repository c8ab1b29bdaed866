// What is said about a film besides its streams: titles, chapters, the timecode of its first picture.
#pragma once

#include <string>

#include "core/value/anycontainer.h"
#include "plugins/av/mux/containers.h"

namespace av {

// Puts what `meta` has into `film` as far as the container holds it, and returns the names of the rest,
// separated by ", ". Known keys are those of a decoder's "meta": texts such as "title", "timecode" (or
// "startTimecode") and "chapters", a Vector of Dicts with "time" (MediaTime, or seconds) and "title".
// `seconds` is the length of the film if it is known, else 0; `start` the time at which the container puts
// its first picture. Called before the container is begun, and after its streams are made.
std::string setFilmWords(AVFormatContext& film, const Container& container, const AnyDict& meta,
                         double seconds, double start);

}  // namespace av
