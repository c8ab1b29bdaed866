// Parameters of the video encoders.
//
// "type" is the FOURCC of the input frames. Size and frame rate have no default and must be set before open.
// "frameAspect" 0 means square pixels. "crf" selects constant quality and "vBitrate" a bit rate: the one that
// was set last counts.
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
    bool hasRate = false;
    double frameAspect = 0;
    unsigned type = 0;
    int vbr = 1;
    double bitrate = 0, maxBitrate = 0, minBitrate = 0;  // bit/s; 0: not set
    double quality = -1;                                 // -1: by bit rate
    int n = 1, m = 1;  // GOP length; distance from one anchor (I or P picture) to the next
    int threads = 0;   // of the codec; 0: one per core
    int profile = -1;  // number of a preset; -1: none
    int matrix = 0;    // 1 BT.601, 2 BT.709; 0: by the picture's height
    int primaries = 0, transfer = 0, space = 0;  // code points of ITU-T H.273; 0: follows `matrix`
    bool pal = true, twoPass = false, firstPass = false;
    int topLines = 0;                                 // blanking lines above the active picture: 32 in IMX
    std::string preset, tune, codecProfile, options;  // in the library's words
    std::string timecode;                             // of the first picture, "HH:MM:SS:FF"
    std::string profileOptions;                       // options of the library that the preset `profile` sets
    bufstream* passRecord = nullptr;                  // statistics of the first pass; borrowed

    bool byQuality() const { return quality >= 0; }
    bool isInterlaced() const { return rate.interlaced() != 0; }
    // Whether the codec has interlaced pictures of this size and type. True while the size is not set, if
    // some size has them.
    bool supportsFields() const;
    // False for a size that H.263 lacks: it has five. The limits in VideoCodec are checked elsewhere.
    bool supportsSize() const;
    // The parameters that the codec has, in the order in which they are stored and restored.
    static std::span<const QvParamRow<VideoSettings>> rows(const VideoCodec& codec);
    // Sets what the preset `profile` sets for this codec. Other settings are unchanged.
    void applyProfile();
};

}  // namespace av
