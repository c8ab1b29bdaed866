// Pictures of noise, and their bytes for comparison.
#pragma once

#include <random>
#include <vector>

#include "core/media/qvframe.h"
#include "core/value/anycontainer.h"

struct FrameModel {
    unsigned fourcc = 0;
    int width = 0;
    int height = 0;
    std::vector<std::vector<unsigned char>> planes;
    std::vector<int> strides;
    bool operator==(const FrameModel&) const = default;
};

inline FrameModel modelOf(const QvFrame& frame) {
    FrameModel model{frame.four_cc(), frame.width(), frame.height(), {}, {}};
    for (int p = 0; p < frame.planes(); ++p) {
        model.planes.emplace_back(frame.plane(p), frame.plane(p) + frame.plane_bytes(p));
        model.strides.push_back(frame.stride(p));
    }
    return model;
}

// The rows that copies know, without padding.
inline std::vector<unsigned char> pixelsOf(const QvFrame& frame) {
    QvFrame plain;
    plain.init(frame.four_cc(), frame.width(), frame.height());
    std::vector<unsigned char> pixels;
    for (int p = 0; p < frame.planes(); ++p)
        for (int row = 0; row < frame.height(p); ++row) {
            const unsigned char* first = frame.plane(p) + row * frame.stride(p);
            pixels.insert(pixels.end(), first, first + plain.stride(p));
        }
    return pixels;
}

// A frame of noise; every stride is `padding` bytes wider than the default.
inline void makeNoise(QvFrame& frame, unsigned fourcc, int width, int height, int padding, unsigned seed) {
    QvFrame plain;
    plain.init(fourcc, width, height);
    AnyVector strides;
    for (int p = 0; p < plain.planes(); ++p) strides.append(Any(plain.stride(p) + padding));
    frame.init(fourcc, width, height, nullptr, &strides);
    std::minstd_rand random(seed);
    for (int p = 0; p < frame.planes(); ++p)
        for (int i = 0; i < frame.plane_bytes(p); ++i)
            frame.plane(p)[i] = static_cast<unsigned char>(random() >> 8);
    frame.framerate = QvFramerate(25.0, 1);
    frame.frameNr = static_cast<int>(seed);
    frame.setTimestamp(seed + 1);
}

inline QvFrame noiseFrame(unsigned fourcc, int width, int height, int padding, unsigned seed) {
    QvFrame frame;
    makeNoise(frame, fourcc, width, height, padding, seed);
    return frame;
}

inline const std::vector<unsigned>& allFormats() {
    using namespace QvFourcc;
    static const std::vector<unsigned> formats = {GRAY, I420, YV12, I422, W016, YUY2, YUYV, UYVY, Y216,
                                                  v210, BGR3, BGR4, BGRA, ARGB, R32C, b64a, R555, R565};
    return formats;
}
