// Pictures of noise, and their bytes for comparison.
#pragma once

#include <string>
#include <vector>

#include "core/value/anycontainer.h"
#include "tests/support/pictures.h"

// All that a copy must give: format, size, strides and bytes.
inline std::string modelOf(const QvFrame& frame) {
    std::string model =
        frame.str_four_cc() + std::to_string(frame.width()) + 'x' + std::to_string(frame.height());
    for (int p = 0; p < frame.planes(); ++p) model += ' ' + std::to_string(frame.stride(p));
    return model + ':' + pictureBytes(frame);
}

// A frame of noise; every stride is `padding` bytes wider than the default.
inline QvFrame noiseFrame(unsigned fourcc, int width, int height, int padding, unsigned seed) {
    QvFrame plain, frame;
    plain.init(fourcc, width, height);
    AnyVector strides;
    for (int p = 0; p < plain.planes(); ++p) strides.append(Any(plain.stride(p) + padding));
    frame.init(fourcc, width, height, nullptr, &strides);
    fillPicture(frame, seed);
    frame.framerate = QvFramerate(25.0, 1);
    frame.frameNr = static_cast<int>(seed);
    frame.setTimestamp(seed + 1);
    return frame;
}

inline const std::vector<unsigned>& allFormats() {
    using namespace QvFourcc;
    static const std::vector<unsigned> formats = {GRAY, I420, YV12, I422, W016, YUY2, YUYV, UYVY, Y216,
                                                  v210, BGR3, BGR4, BGRA, ARGB, R32C, b64a, R555, R565};
    return formats;
}
