// The lines of an SCC file that matter: a timecode and words of four hexadecimal digits, each a byte pair.
#pragma once

#include <cstdint>
#include <string>
#include <utility>
#include <vector>

#include "core/measure/qvframerate.h"
#include "core/measure/timecode.h"

class Any;
class QvByteSource;

struct SccLine {
    QvTimecode timecode;
    std::size_t words;  // how many of SccFile::words are this line's
};

struct SccFile {
    std::vector<SccLine> lines;
    std::vector<std::uint16_t> words;  // of all lines, in order; the first byte is the high one
    int highestFrame = 0;              // of the timecodes
    bool dropFrame = false;            // a line has ";" before the frames

    // What was passed over or is no hexadecimal number: the line, from 1, and a sentence. The first ones.
    static constexpr int mostReported = 5;
    std::vector<std::pair<int, std::string>> damage;
    int damaged = 0;  // all of them

    // With `dropFrameLines` lines with ";" count, carriage returns end lines, and a UTF-8 mark may stand at
    // the start. 0; -1: can't be opened or read; -15: no SCC file.
    int read(const Any& filename, bool dropFrameLines);
    // From where the source is to its end. `name` is for messages.
    int read(QvByteSource& source, const Any& name, bool dropFrameLines);
    // What the highest frame number suggests; with `warn` the log says so if that is a guess.
    QvFramerate likelyRate(bool warn) const;
};
