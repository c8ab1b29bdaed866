// Fits encoders to an input: each property that is asked for is set to what the encoder, or its preset, can
// do nearest to the input's.
//
//     QvFormatMatcher matcher(QvFormatMatcher::dimensions | QvFormatMatcher::framerate, 0, &preset);
//     matcher.matchFile(decoder, pipe);
//
// A preset's range wins over the encoder's. Ranges that an encoder answers as parameters:
//
//     sizeRange        Dict "wmin", "wmax", "hmin", "hmax"; or Vector of Dicts "w", "h"
//     framerateRange   Vector of QvFramerate
//     bitrateRange     Vector of Dicts "type" (0 constant, 1 variable), "range" (video: Pair lowest, highest;
//                      audio: Vector of Int32)
//     aspectRange      Dict "min", "max"; or Vector of Float, 0.0 for the encoder's own picture
//     gopRange         Dict "minM", "maxM" and "minP", "maxP" or "minN", "maxN"
//     channelsRange, samplerateRange, bitsPerSampleRange   Vector of Int32
//     canChangeDominance   true: the encoder may take either field order
//
// What the encoder's setParam throws (QvParamException) passes, with what was set before it still set; only
// that of "bitsPerSample" is caught.
#pragma once

#include "core/arch/api.h"
#include "core/measure/bitrate.h"
#include "core/measure/qvframerate.h"
#include "core/value/any.h"

class AnyDict;
class QvAudioEncoder;
class QvDecodePipe;
class QvEncodePipe;
class QvPreset;
class QvVideoEncoder;

class QV_API QvFormatMatcher {
  public:
    // What is matched, as bits.
    enum Property {
        type = 1,  // PAL or NTSC
        dimensions = 2,
        framerate = 4,
        videoBitrate = 8,
        frameAspect = 16,
        gop = 32,
        channels = 0x1000,
        samplerate = 0x2000,
        audioBitrate = 0x4000,
        bitsPerSample = 0x8000,
        everything = 0xf03f,
    };

    // `second` is kept and not used. `preset` may be null; else it outlives the matcher.
    QvFormatMatcher(int properties, int second, const QvPreset* preset);

    // All streams of a pipe; those that the input has no counterpart for go by its first of the type. 0.
    int matchFile(const QvDecodePipe* decoder, QvEncodePipe* encoder) const;
    int matchVideo(const QvDecodePipe* decoder, int stream, QvVideoEncoder* encoder) const;
    int matchAudio(const QvDecodePipe* decoder, int stream, QvAudioEncoder* encoder) const;

  private:
    int properties_;
    [[maybe_unused]] int second_;
    const AnyDict* presetMeta_;  // null for none
};
