// Options of the libraries for a container, as text: "name=value:name=value".
#pragma once

#include <string>

#include "plugins/av/source/optionlist.h"

namespace av {

// What is wrong with the text for that format of the libraries, with similar names for one that is unknown;
// "" if nothing is. `options` gets the entries. Throws std::bad_alloc.
std::string parseMuxOptions(const std::string& text, const char* format, OptionList& options);

// They ask for MP4 in fragments, which has no index of the whole film.
bool makesFragments(const std::string& options);

}  // namespace av
