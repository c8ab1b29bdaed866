// What a stream of pictures is, in the engine's values.
#pragma once

#include <string>

#include "plugins/av/source/avheaders.h"

namespace av {

std::string codecName(AVCodecID codec);    // as people know it: "H.264", "MPEG-2"
int fieldOrderOf(const AVFrame& picture);  // 0 progressive, 1 top field first, 2 bottom field first
int matrixOf(const AVFrame& picture);      // QvYUVMatrix
int codePoint(int value);                  // of ITU-T H.273; 0 for what is reserved or not stated
struct Turn {
    int clockwise = 0;      // degrees to be shown upright: 0, 90, 180, 270
    bool mirrored = false;  // top to bottom, before it is turned

    bool any() const { return clockwise != 0 || mirrored; }
};
// What the picture itself says (a photograph does), or the container of its stream.
Turn turnOf(const AVStream& stream, const AVFrame& picture);

}  // namespace av
