// Closed captions that are embedded in coded pictures, and the same as frames of the engine carry them.
#pragma once

#include <vector>

#include "core/caption/cc/qvcc.h"
#include "plugins/av/source/avheaders.h"

class MediaTime;
class QvFrame;

namespace av {

// Puts the captions of the picture (CEA-608 and CEA-708 pairs of an ATSC A/53 block) into the subpicture slot
// of `to`, with that time; without captions the slot becomes empty.
void carryCaptions(const AVFrame& picture, const MediaTime& time, QvFrame& to);

// Captions on their way into coded pictures. A picture holds 31 pairs at most; what is beyond them goes into
// the next ones.
class CaptionInput {
  public:
    // Gives the picture those of `from`, and those that are due. False without memory.
    bool attach(const QvFrame& from, AVFrame& picture);
    // Whether there were any so far.
    bool used() const { return used_; }
    void reset() { *this = CaptionInput(); }

  private:
    std::vector<QvCcBytePair> due_;
    bool used_ = false;
};

}  // namespace av
