// Parameters of the video encoders.
//
// "type" is the FOURCC of the frames that are taken. A size of 0 and a frame rate that is not set mean those
// of the source; both must be set before open. "frameAspect" 0 means square pixels. "crf" decides the
// quality until a bit rate is set, and again when it is set after that.
#pragma once

#include <span>
#include <string>

#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"
#include "core/stream/bufstream.h"
#include "plugins/av/encode/videocodecs.h"

namespace av {

struct VideoSettings {
    explicit VideoSettings(const VideoCodec& row);

    const VideoCodec* codec;
    int width = 0, height = 0;
    QvFramerate rate{25.0};
    bool rateKnown = false;
    double frameAspect = 0;
    unsigned type = 0;
    int vbr = 1;
    double target = 0, most = 0, least = 0;  // bits a second
    double quality = -1;                     // -1: by bit rate
    int n = 1, m = 1;                        // pictures of a group, and from one anchor to the next
    int threads = 0, profile = -1, matrix = 0;
    int primaries = 0, transfer = 0, space = 0;  // code points of ITU-T H.273; 0: by the matrix
    bool pal = true, twoPass = false, firstPass = false;
    int topLines = 0;  // that the picture has above the shown ones
    std::string preset, tune, codecProfile, options;
    std::string timecode;         // of the first picture, "HH:MM:SS:FF"
    std::string profileOptions;   // of the preset
    bufstream* passes = nullptr;  // borrowed

    bool byQuality() const { return quality >= 0; }
    bool codesFields() const { return rate.interlaced() != 0; }
    // The codec has such pictures of two fields; of a size that is not set yet, it may.
    bool takesFields() const;
    // Of H.263 there are five; of the others only the limits of VideoCodec count.
    bool takesSize() const;
    // The tables that the codec has, in the order in which they are stored and restored.
    static std::span<const QvParamRow<VideoSettings>> rows(const VideoCodec& codec);
    // What a preset stands for; what it leaves open stays.
    void applyProfile();
};

}  // namespace av
