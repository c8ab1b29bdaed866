// What the raw video encoder knows about pixel formats.
#pragma once

#include "core/media/qvframe.h"
#include "core/value/anycontainer.h"

namespace rawvenc {

// Bytes of one frame as it is put out.
int v210Bytes(int width, int height);
// At least as many bytes as a frame of any known format has, without overflow.
long long frameBytesBound(int width, int height);

// Into a frame with the default strides, which is made again only for another size or type. QvStatus::ok, or
// why it can't be made.
int copyPacked(QvFrame& to, const QvFrame& from);

// The formats that the encoder offers as input, the first being the default.
AnyVector inputTypes();
// Dictionaries "type" (FOURCC) and "name" for a user interface.
AnyVector allowedTypes(int profile);
// QvFramerate values for a user interface.
AnyVector framerates();

}  // namespace rawvenc
