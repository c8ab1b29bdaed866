// The format of one stream, read once from what a decoder answers and typed from there on.
#pragma once

#include "core/arch/api.h"
#include "core/measure/qvgeometry.h"

class AnyDict;

struct QV_API VideoFormat {
    VideoFormat() = default;
    // From the parameters of a stream: see core/decode/qvdecoder.h. What is absent keeps its default.
    explicit VideoFormat(const AnyDict& stream);
    bool hasRate() const { return framerate.rate().ratio() > 0; }

    unsigned fourcc = 0;
    int width = 0;   // pixels
    int height = 0;  // pixels
    double frameAspect = 1.0;
    QvFramerate framerate{0.0};  // 0 when the stream gives none
    int frames = 0;
};

struct QV_API AudioFormat {
    static constexpr int defaultBits = 16;
    static constexpr long long unknownLength = 92233720368547LL;  // samples of a stream without a known end

    AudioFormat() = default;
    explicit AudioFormat(const AnyDict& stream);
    int bytesPerSample() const { return (bits + 7) / 8; }  // of one channel

    int samplerate = 0;  // samples a second, below 1 when the stream gives none
    int channels = 0;    // below 1 when the stream gives none
    int bits = defaultBits;
    long long samples = unknownLength;  // of each channel
};
