// Single pictures as files.
#pragma once

#include "core/arch/api.h"

class Any;
class QvFrame;

class QV_API QvImage {
  public:
    enum Format { png = 0, bmp = 1 };

    // Reads a PNG. The picture becomes BGR4 of the image's size rounded up to even, black where the image has
    // no pixel; a frame that has this format and size is reused as it is. `alpha`, if given and the image has
    // an alpha channel, becomes GRAY of the same size. A damaged image gives what could be read,
    // or nothing, which leaves the frame as it was: the result is 0, with a warning in the user log.
    // 0; -1 with a message in the user log if the file can't be opened, without if it is no PNG.
    static int loadFrame(QvFrame& picture, const Any& path, QvFrame* alpha = nullptr, unsigned flags = 0);

    // Writes a picture, as BMP with format 1 (BGR3 only, otherwise an assertion), else as PNG, for which any
    // format but BGR3 goes through the "scaler" module. 0, or -1 with a message in the user log; errno then
    // has the system's reason, 0 if it has none.
    static int saveFrame(const QvFrame& frame, const Any& path, int format);
};
