// Brings drawn text into the pixel format of the picture that it is to stand on.
#pragma once

#include <memory>

class QvCodec;
class QvFrame;
class QvVideoFilter;

// The "scaler" module at unchanged size. It stays open as long as format and size stay.
class BandConverter {
  public:
    BandConverter();
    ~BandConverter();

    // False if the system can't convert to that format; the first failure is told in the debug log.
    bool convert(const QvFrame& band, unsigned fourcc, QvFrame& out);

  private:
    std::unique_ptr<QvCodec> codec_;
    QvVideoFilter* filter_ = nullptr;  // of codec_; null unless it is open
    unsigned fourcc_ = 0;
    int width_ = 0;
    int height_ = 0;
    bool failed_ = false;

    bool open(unsigned fourcc, int width, int height);
    bool fail(unsigned fourcc);
};
