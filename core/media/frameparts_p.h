// Parts of pictures, copied into a frame or drawn over it: the operations of QvFrame of these names, which
// say what they do. `dst` is the frame that is written, and `format` its format; the other frames may be the
// same one.
#pragma once

#include "core/media/qvframe.h"

namespace qvframes {

int clip(QvFrame& dst, const QvPixelFormat& format, const QvFrame& src, int srcX, int srcY, int dstX,
         int dstY, int width, int height);
int blend(QvFrame& dst, const QvPixelFormat& format, int x, int y, const QvFrame& src, const QvFrame* mask,
          const QvFrame* chromaMask);
int blend(QvFrame& dst, const QvPixelFormat& format, int x, int y, const QvFrame& src, double alpha);

}  // namespace qvframes
