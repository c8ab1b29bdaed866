// What an encode pipe is set to, in one line: "Format: AVI; Video: RAW, 1920x1080, 25p; Audio: PCM, 48000Hz,
// stereo".
#pragma once

#include <string>

class QvEncodePipe;

// Of the first stream of each kind in a pipe.
std::string qvPipeInfo(const QvEncodePipe& pipe);
