// Frames to a fixed format at their own size, and a few conversions of single formats.
#pragma once

#include <memory>

#include "core/arch/api.h"

class QvCodec;
class QvFrame;

// Converts with the module "scaler" of the registry, which the engine must have been initialised with.
class QV_API QvColorConverter {
  public:
    // `fourcc` of the outputs. With a flag the YUV matrix changes so; the first one wins. Without, the height
    // decides, below 720 lines BT.601, unless a frame knows its own. Asserts on an unknown FOURCC.
    QvColorConverter(unsigned int fourcc, bool itu709To601, bool itu601To709);
    ~QvColorConverter();
    QvColorConverter(const QvColorConverter&) = delete;
    QvColorConverter& operator=(const QvColorConverter&) = delete;

    // `out` becomes the converted picture with the metadata of `in`. 0, or a status with a line in the log. A
    // size that no picture can be made of ends the converter: it asserts from then on.
    int convert(const QvFrame& in, QvFrame& out);

  private:
    bool _inputFormatChanged(const QvFrame& in) const;
    int _reopenConverter(const QvFrame& in);

    std::unique_ptr<QvCodec> codec_;
    int width_ = 0, height_ = 0;  // as the codec was opened with
    bool open_ = false;
};

// Reverses the four bytes of each pixel. `out` gets that format and the size of `in` if it differs; it keeps
// its metadata. Asserts if `in` has another format.
QV_API void qvColorARGBToBGR4(const QvFrame& in, QvFrame& out);
QV_API void qvColorBGR4ToARGB(const QvFrame& in, QvFrame& out);

// A frame of packed 4:2:2 (YUYV, YUY2 or UYVY) to I422 of the same size, field by field if it is interlaced.
QV_API void qvColorYUYVToI422(const QvFrame& in, QvFrame& out);
// The same, then packed as v210 into `dest`: height lines of (width + 47) / 48 * 128 bytes, each sample
// shifted up by two bits. After the last whole group of six pixels as many bytes are cleared as there are
// pixels left; the rest of a line is unchanged. `scratch` becomes the I422 frame.
QV_API void qvColorYUYVToV210(const QvFrame& in, unsigned char* dest, QvFrame& scratch);
