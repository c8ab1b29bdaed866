// Reads a film again that was written.
#pragma once

#include <string>
#include <vector>

#include "core/value/any.h"

namespace av {

struct FilmExpectation {
    bool video;
    long long units;  // written; -1: its index does not count them
};

// `format` is that of a Container. What is wrong with the file: it can't be opened, streams are missing, or
// its index has other counts. "" if nothing is. Reads headers and indexes, not the units.
std::string checkFilm(const Any& file, const char* format, const std::vector<FilmExpectation>& streams);

}  // namespace av
