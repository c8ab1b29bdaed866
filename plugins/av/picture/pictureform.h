// The engine's form of a decoded picture: which one a layout of the library becomes, and the pixels.
//
//     of the library                         engine                       by
//     4:2:0, 8 bits                          I420                         copying rows
//     4:2:0, more bits                       W016, in the high bits       shifting
//     4:2:2, 8 bits; 4:1:1, 4:4:0            YUYV                         interleaving; libswscale
//     4:2:2, more bits                       Y216, in the high bits       shifting
//     4:4:4, RGB, palette, 8 bits            BGRA with alpha, else BGR4   libswscale, BGRA by copying
//     4:4:4, RGB, XYZ, more bits             b64a                         libswscale, BGRA64 by copying
//     grey, 4:1:0                            I420, W016                   libswscale
//
// The engine's YUV has video levels: full range is converted.
#pragma once

#include <memory>
#include <string>

#include "plugins/av/source/avheaders.h"

class QvFrame;
struct SwsContext;

namespace av {

struct PictureForm {
    unsigned fourcc = 0;                   // 0: none fits
    AVPixelFormat from = AV_PIX_FMT_NONE;  // the layout that goes into it without libswscale
    int shift = 0;                         // of its samples, to the left
    std::string lost;                      // what it can't hold, or how it is made: one line; "" for nothing
};
bool isFullRange(const AVFrame& picture);
PictureForm formOf(AVPixelFormat layout, bool fullRange);

// Puts decoded pictures into a frame of one form and size; a picture of another layout or size is converted.
class FormWriter {
  public:
    FormWriter(const PictureForm& form, int width, int height);
    ~FormWriter();
    FormWriter(const FormWriter&) = delete;
    FormWriter& operator=(const FormWriter&) = delete;

    // `to` has the form and the size. False if the library can't convert.
    bool write(const AVFrame& from, QvFrame& to);

  private:
    struct Source {
        int width = 0, height = 0, layout = 0;
        bool full = false;
        int matrix = 0;
        bool operator==(const Source&) const = default;
    };
    PictureForm form_;
    int width_, height_;
    SwsContext* scaler_ = nullptr;
    Source source_;  // what it converts from
    FramePtr scaled_;

    bool prepare(const AVFrame& from);
    const AVFrame* convert(const AVFrame& from);
};

}  // namespace av
