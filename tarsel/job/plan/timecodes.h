// Timecodes of films, as texts.
#pragma once

#include <qvplugcore/qvplugcore.h>

#include <functional>
#include <string>

// The timecode that is `frames` frames after `text`. `text` counts frames at the rate `from`; the result is
// for pictures at the rate `to`: its second is the same, its frame is converted. A ';' means drop-frame,
// which exists at 30000/1001 and 60000/1001 only. `frames` is called with `from`, marked as drop-frame if the
// text is.
std::string movedTimecode(const std::string& text, const QvFramerate& from, const QvFramerate& to,
                          const std::function<long long(const QvFramerate& from)>& frames);
