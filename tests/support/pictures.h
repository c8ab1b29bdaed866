// Pictures and sounds with contents that show a wrong byte, row or plane.
#pragma once

#include <string>

#include "core/media/qvbuffer.h"

// Every byte of every plane, padding included, depends on its place and on `seed`.
inline void fillPicture(QvFrame& frame, unsigned seed) {
    unsigned value = seed * 2654435761u + 1;
    for (int plane = 0; plane < frame.planes(); ++plane)
        for (int i = 0; i < frame.plane_bytes(plane); ++i) {
            value = value * 1664525u + 1013904223u;
            frame.plane(plane)[i] = static_cast<unsigned char>(value >> 24);
        }
}

inline QvFrame makePicture(unsigned fourcc, int width, int height, unsigned seed = 1) {
    QvFrame frame;
    frame.init(fourcc, width, height);
    fillPicture(frame, seed);
    return frame;
}

// The planes one behind the other.
inline std::string pictureBytes(const QvFrame& frame) {
    return {reinterpret_cast<const char*>(frame.plane(0)), static_cast<size_t>(frame.total_bytes())};
}

inline void fillSound(QvPcm& pcm, int samples, int channels, int bytesPerSample, int samplerate,
                      unsigned seed = 1) {
    pcm.init(samples, channels, bytesPerSample, samplerate);
    unsigned value = seed * 2654435761u + 1;
    for (int i = 0; i < samples * channels * bytesPerSample; ++i) {
        value = value * 1664525u + 1013904223u;
        pcm.ptr(0)[i] = static_cast<unsigned char>(value >> 24);
    }
    pcm.setSamples(samples);
}

inline std::string soundBytes(const QvPcm& pcm) {
    return {reinterpret_cast<const char*>(pcm.ptr(0)), static_cast<size_t>(pcm.bytes())};
}
