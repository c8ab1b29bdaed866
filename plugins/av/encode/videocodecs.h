// The video encoders: one row each.
#pragma once

#include <span>

#include "plugins/av/source/avheaders.h"

namespace av {

// An input format of an encoder, and the library's layout that it is converted to.
struct VideoForm {
    unsigned fourcc;
    AVPixelFormat layout;
    const char* profile = nullptr;  // of the codec, that this layout needs; null: none
};

namespace VideoTrait {
enum : unsigned {
    rated = 1,        // follows a bit rate
    groups = 2,       // has groups of pictures
    reorders = 4,     // has B-frames
    interlaced = 8,   // codes interlaced pictures
    setsFirst = 16,   // parameter sets are written before each key frame
    borrows = 32,     // copies a picture before it returns, so the frame can be lent
    statsText = 64,   // the library returns the statistics of a first pass as text
    statsFile = 128,  // the library writes them to files
    pixelAspect = 256,
    captions = 512,   // keeps caption data with its pictures
    keepsForm = 1024  // for masters and archives: takes the form that the input has
};
}

struct VideoCodec {
    const char* module;
    const char* standard;  // tells rows of one module apart; "" if there is only one
    const char* encoder;   // the libraries' name
    std::span<const VideoForm> forms;
    unsigned fourcc;  // of the units; see plugins/wire.h
    const char* extension;
    unsigned traits;
    int minSide, maxSide, sideStep;  // width and height, pixels
    double minBitrate, maxBitrate;   // bit/s
    double defaultBitrate;           // 0: by quality
    const char* quality;             // name of the library's option for constant quality; "": none
    double defaultQuality, maxQuality;
    const char *preset, *defaultPreset;  // name of the option for speed, "": none; and its value
    const char* tune;                    // name of the option
    int defaultN, defaultM, maxM;
    const char* options;  // always set, "name=value:..."
    const char* profile;  // default; "": the library's
    // Values of preset and tune, each between spaces, where the library rejects a wrong one only when it is
    // opened. "": the library can check the value at once.
    const char* presetWords = "";
    const char* tuneWords = "";

    bool has(unsigned trait) const { return (traits & trait) != 0; }
    const VideoForm* form(unsigned fourcc) const;
    const AVCodec* library() const;  // null: not in the installed libraries
};

// The module's row of that standard, or its first row; null if there is none.
const VideoCodec* videoCodec(const char* module, const char* standard = nullptr);

}  // namespace av
