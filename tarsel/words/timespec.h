// Times, rates and sizes as people write them.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include <qvplugcore/qvplugcore.h>

#include "tarsel/words/messages.h"

// SS[.mmm], MM:SS[.mmm], HH:MM:SS[.mmm], 120f (frames), HH:MM:SS:FF and HH:MM:SS;FF (timecode). Frames and
// timecode need `rate`. Throws Failure (usage) with `option` in the line.
MediaTime parseTime(std::string_view text, const std::optional<QvFramerate>& rate, std::string_view option);

// A time in what lasts `length`; "-10" and "-250f" are so long before its end. Throws Failure (usage) for
// what is before its start as well.
MediaTime parseInstant(std::string_view text, const std::optional<QvFramerate>& rate, std::string_view option,
                       const MediaTime& length);
// So much after `from`; frames are counted from the one that `from` is in.
MediaTime parseSpan(std::string_view text, const std::optional<QvFramerate>& rate, std::string_view option,
                    const MediaTime& from);

// Frames a second: "25", "29.97" and the other NTSC decimals (30000/1001), "30000/1001", "25i" (top field
// first), "25b" (bottom field first), and the names "pal", "ntsc", "film", "ntsc-film". A rate of fields, as
// "50i" for 25 frames, is refused with the one of frames; "50fi" says that there are 50 frames.
QvFramerate parseRate(std::string_view text, std::string_view option);
// Refuses an interlaced rate that is one of fields; `text` is how the user wrote it.
void requireFrames(const QvFramerate& rate, std::string_view text, std::string_view option);
// The shortest text that parseRate reads as this rate and scan: "25", "29.97", "25i", "3000/7".
std::string formatRate(const QvFramerate& rate);

// The rate of timecodes, which may count in drop frame: "29.97df". Others have no such form.
QvFramerate parseTimecodeRate(std::string_view text, std::string_view option);
std::string formatTimecodeRate(const QvFramerate& rate);

struct Size {
    int width;
    int height;
};
// "1280x720": both from 1 to `most`. Throws Failure with the message `wrong`.
Size parseSize(std::string_view text, std::string_view option, int most = 65535, Msg wrong = Msg::sizeWrong);

// The same, or -1 for one of both, which is then -1 here: "1280x-1".
Size parseSizeOrShape(std::string_view text, std::string_view option);

// A number within bounds.
long long parseNumber(std::string_view text, long long low, long long high, std::string_view option);
double parseDecimal(std::string_view text, double low, double high, std::string_view option);

// The FOURCC of a pixel format that the engine knows, as "I420".
unsigned parsePixel(std::string_view text, std::string_view option);
std::string fourccText(unsigned fourcc);

std::string formatTime(double seconds);  // H:MM:SS.mmm
std::string formatBytes(long long bytes);
