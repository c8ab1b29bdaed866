// Options of the libraries for a container, as text: "name=value:name=value".
#pragma once

#include <string>

struct AVDictionary;

namespace av {

// What is wrong with the text for that format of the libraries, with similar names for one that is unknown;
// "" if nothing is. `options`, which may be null, gets the entries.
std::string parseMuxOptions(const std::string& text, const char* format, AVDictionary** options);

// They ask for MP4 in fragments, which has no index of the whole film.
bool makesFragments(const std::string& options);

}  // namespace av
