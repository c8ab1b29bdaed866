// Closed captions that are embedded in coded pictures, as frames of the engine carry them.
#pragma once

#include "plugins/av/source/avheaders.h"

class MediaTime;
class QvFrame;

namespace av {

// Puts the captions of the picture (CEA-608 and CEA-708 pairs of an ATSC A/53 block) into the subpicture slot
// of `to`, with that time; without captions the slot becomes empty.
void carryCaptions(const AVFrame& picture, const MediaTime& time, QvFrame& to);

}  // namespace av
