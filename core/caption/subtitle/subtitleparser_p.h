// The two text formats, line by line.
#pragma once

#include <cstddef>
#include <functional>
#include <string>
#include <string_view>

#include "core/measure/qvgeometry.h"

struct ParsedSubtitle {
    MediaTime start;
    MediaTime end;
    std::string text;        // lines separated by "|"
    bool subViewer = false;  // its times were separated by a comma
};

using SubtitleTaker = std::function<void(ParsedSubtitle&&)>;

// "{first}{last}line|line": gives each entry to `take`. 0, or -1 at a malformed line, which ends it.
int parseSub(std::string_view text, const QvFramerate& rate, const SubtitleTaker& take);

// Number, times and lines of text, up to an empty line. A number without times ends it.
// Returns the bytes of text from there on, 0 if all was read.
std::size_t parseSrt(std::string_view text, const SubtitleTaker& take);
