// Captions as texts: SubRip, WebVTT, JSON lines.
#pragma once

#include <string>
#include <vector>

#include <qvplugcore/qvplugcore.h>

// All of them in the order of their times, as UTF-8 with LF. Italics are kept as <i>. WebVTT also says how
// high a caption stands that is not at the bottom.
std::string srtText(const std::vector<QvCcCue>& cues);
std::string vttText(const std::vector<QvCcCue>& cues);

// An object a line: "start" and "end" in seconds, "timecode" and "end_timecode" at the rate, "field" (1 or
// 2), "text" with its rows parted by LF, "row" and "column" of the first row, and "open": true where nothing
// in the file ends the caption.
std::string captionJson(const QvCcCue& cue, const QvFramerate& rate, int field);

// "HH:MM:SS:FF", before the frames with ";" at a drop-frame rate.
std::string timecodeText(const MediaTime& time, const QvFramerate& rate);
