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

// "25", "29.97", "30000/1001", "25i" (top field first), "25b" (bottom field first).
QvFramerate parseRate(std::string_view text, std::string_view option);

struct Size {
    int width;
    int height;
};
// "1280x720": both from 1 to `most`. Throws Failure with the message `wrong`.
Size parseSize(std::string_view text, std::string_view option, int most = 65535, Msg wrong = Msg::sizeWrong);

// A whole number within bounds.
long long parseNumber(std::string_view text, long long low, long long high, std::string_view option);

// The FOURCC of a pixel format that the engine knows, as "I420".
unsigned parsePixel(std::string_view text, std::string_view option);
std::string fourccText(unsigned fourcc);

std::string formatTime(double seconds);  // H:MM:SS.mmm
std::string formatBytes(long long bytes);
