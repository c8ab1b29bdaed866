// A frame that shows the picture of another one under a number of its own; no pixel is copied. Internal to
// this folder.
#pragma once

#include "core/media/qvframe.h"

class FrameWindow {
  public:
    // The next number, the picture of `source`, its rate and its metadata. The source outlives the use of
    // the window. 0, QvStatus::failed for an empty source, QvStatus::outOfMemory.
    int show(QvFrame& source);
    // The source is about to be destroyed. Numbers continue after it.
    void forget() { frame_.destroy(); }
    void restart();  // the next number is 0

    QvFrame& frame() { return frame_; }

  private:
    QvFrame frame_;
    int number_ = -1;
};
