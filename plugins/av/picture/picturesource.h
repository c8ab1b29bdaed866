// Pictures at a constant rate that can be read and sought by their number.
#pragma once

#include <string>

#include "core/measure/qvframerate.h"
#include "plugins/av/picture/picturewords.h"

class QvFrame;

namespace av {

struct PictureFormat {
    int width = 0, height = 0;
    int fourcc = 0;  // the engine's form, see picture/pictureform.h
    QvFramerate rate;
    bool variable = false;  // the times in the file are not those of a constant rate
    int frames = 0;         // exact
    double pixelAspect = 1;
    int fieldOrder = 0;                          // the engine's value
    int colourMatrix = 0;                        // the engine's value
    int primaries = 0, transfer = 0, space = 0;  // code points of ITU-T H.273; 0: not stated
    Turn turn;                                   // how the frames are still to be turned
    std::string codec;                           // as people know it: "H.264", "MPEG-2"
    std::string lost;                            // what the form can't hold, one line; "" for nothing
    double bitrate = 0;                          // bits a second; 0: unknown
};

class PictureSource {
  public:
    PictureSource() = default;
    PictureSource(const PictureSource&) = delete;
    PictureSource& operator=(const PictureSource&) = delete;
    virtual ~PictureSource() = default;

    virtual const PictureFormat& format() const = 0;
    // The next read gives picture n, 0 to format().frames.
    virtual bool seek(int n) = 0;
    enum class Read { picture, end, failed };
    // The next picture, in the engine's form, in frame(). After `failed`, failure() is the reason.
    virtual Read read() = 0;
    virtual QvFrame& frame() = 0;
    virtual const std::string& failure() const = 0;
    virtual int concealed() const = 0;  // pictures so far that were damaged or not delivered
};

}  // namespace av
