// Timecodes of films, as texts.
#pragma once

#include <qvplugcore/qvplugcore.h>

#include <functional>
#include <string>

// What `text`, a timecode of frames at the rate `from`, has become `frames` later, for pictures at the rate
// `to`: the second stays, and the frame is the one that is shown then. The text has a ';' where it drops
// numbers, which it does at 30000/1001 and 60000/1001 alone. `frames` gets the rate that counts them.
std::string movedTimecode(const std::string& text, const QvFramerate& from, const QvFramerate& to,
                          const std::function<long long(const QvFramerate& from)>& frames);
