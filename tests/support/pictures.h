// Pictures and sounds with contents that show a wrong byte, row or plane.
#pragma once

#include <string>

#include "core/media/qvbuffer.h"

// Bytes that differ from place to place and from seed to seed.
inline void fillBytes(unsigned char* to, size_t count, unsigned seed) {
    unsigned value = seed * 2654435761u + 1;
    for (size_t i = 0; i < count; ++i) {
        value = value * 1664525u + 1013904223u;
        to[i] = static_cast<unsigned char>(value >> 24);
    }
}

// Every byte of every plane, padding included, depends on its place and on `seed`.
inline void fillPicture(QvFrame& frame, unsigned seed) {
    fillBytes(frame.plane(0), static_cast<size_t>(frame.total_bytes()), seed);
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
    fillBytes(pcm.ptr(0), static_cast<size_t>(samples * channels * bytesPerSample), seed);
    pcm.setSamples(samples);
}

inline std::string soundBytes(const QvPcm& pcm) {
    return {reinterpret_cast<const char*>(pcm.ptr(0)), static_cast<size_t>(pcm.bytes())};
}
