// Frames of one colour.
#pragma once

#include "core/media/qvframe.h"

namespace qvframes {

// Black of every format; the frame has one.
void setBlack(QvFrame& frame, const QvPixelFormat& format);
// As QvFrame::setRGB.
void setRGB(QvFrame& frame, unsigned char r, unsigned char g, unsigned char b);

}  // namespace qvframes
