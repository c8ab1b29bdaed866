// Reads a film again that was written.
#pragma once

#include <string>
#include <vector>

#include "core/value/any.h"

namespace av {

struct FilmExpectation {
    bool video;
    long long units;  // written
};

// `format` is that of a Container. What is wrong with the file: it can't be opened, streams are missing, or
// it has other counts of units. "" if nothing is. Reads headers and indexes, and of a film in `fragments`,
// which has no index of all, every unit.
std::string checkFilm(const Any& file, const char* format, const std::vector<FilmExpectation>& streams,
                      bool fragments);

}  // namespace av
