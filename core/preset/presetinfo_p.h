// One line about an output: "Format: AVI; Video: RAW, 1920x1080, 25p; Audio: PCM, 48000Hz, stereo".
#pragma once

#include <string>

class AnyDict;
class QvEncodePipe;

// Of the first stream of each kind in a pipe.
std::string qvPipeInfo(const QvEncodePipe& pipe);
// Of the names of modules in a preset, for one that no pipe can show.
std::string qvStoredInfo(const AnyDict& preset);
