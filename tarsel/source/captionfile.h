// Caption files as the tool reads them, and what one that is refused holds.
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include <qvplugcore/qvplugcore.h>

// Reads the SCC file of `field` (0 or 1) into `data`, its times counted at `asked`, or at the rate that the
// file suggests. Returns the rate; one of drop frame if the file is, and `asked` is of the same speed. Throws
// Failure (input).
QvFramerate readScc(const std::string& name, int field, const std::optional<QvFramerate>& asked,
                    QvCcData& data);

bool isSubtitleFile(const std::string& name);
// Whether the reader of films is the first that is tried; a film may have subtitles.
bool isFilm(const std::string& name);
// The number of the subtitles in the file that `choice` means: a number, a language ("fra") or "", the first.
// Throws Failure (input) if the file has none of text, or not that.
int subtitleStream(const std::string& name, const std::string& choice);

// Throws Failure (input) for a file that was refused as SCC: it is none, or has no caption lines.
[[noreturn]] void refuseScc(const std::string& name);
// The same of what begins with `head`, of kSccHead bytes where it has as many.
[[noreturn]] void refuseScc(const std::string& name, const std::string& head);
inline constexpr size_t kSccHead = 21;  // the title and the mark of UTF-8
