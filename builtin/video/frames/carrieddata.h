// User data and captions of frames that make no output frame of their own, until one leaves with them.
#pragma once

#include "core/caption/cc/qvcc.h"
#include "core/media/qvuserdata.h"

class QvFrame;

class CarriedData {
  public:
    void addUserData(const QvFrame& frame);
    void addCaptions(const QvFrame& frame);  // a subpicture that is no caption data adds nothing
    // The frame's own are replaced by all that waits, or removed if nothing does; nothing waits then. The
    // frame borrows the user data from this object until the next call.
    void giveUserData(QvFrame& frame);
    void giveCaptions(QvFrame& frame);
    void clear();

  private:
    QvUserData packets_, given_;
    QvCcData captions_;
};
