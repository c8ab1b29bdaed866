// Pictures and sounds with contents that show a wrong byte, row or plane.
#pragma once

#include <string>

#include "core/media/qvbuffer.h"
#include "tests/support/wav_bytes.h"

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

// The planes one after the other.
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
