// The markup in subtitles: what other players know, put into what the renderer knows.
#pragma once

#include <string>
#include <string_view>

// A line of SubRip: tags in any case become lower case, "<br>" (and "[br]" if `brackets`) a line's end; the
// entities of HTML become their characters, and a "<" of an entity never begins a tag.
std::string withSimpleMarkup(std::string_view line, bool brackets);

// The text of a MicroDVD entry: "{y:i}" and "{y:b}" become tags of their line, "{Y:i}" and "{Y:b}" of all
// lines.
std::string withControlCodes(std::string_view text);
