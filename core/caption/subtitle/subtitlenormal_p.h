// Text of subtitle files as people have them, made into what the parser takes.
#pragma once

#include <optional>
#include <string>
#include <string_view>

struct NormalText {
    std::string text;  // without entries: empty
    int entries = 0;
    int lost = 0;                // lines that begin an entry, but whose times or frame numbers can't be read
    std::optional<double> rate;  // frames a second, of a MicroDVD file whose first entry says so
};

// From UTF-8 with any line ends. Hours may have one to three digits or be missing, and so on; text with empty
// lines in it stays together; the tags "<B>", "<br>" and so on become "<b>", a line's end and so on, and the
// entities of HTML their characters. Entries come out in the order of their times.
NormalText normalSrt(std::string_view text);
// "{first}{last}text" a line. "{y:i}" and "{y:b}", and with "Y" for all lines, become tags.
NormalText normalSub(std::string_view text);
