// The video encoders: one row each.
#pragma once

#include <span>

#include "plugins/av/source/avheaders.h"

namespace av {

// A form of frames that an encoder takes, and the layout that it becomes.
struct VideoForm {
    unsigned fourcc;
    AVPixelFormat layout;
    const char* profile = nullptr;  // of the codec, that goes with it by itself
};

namespace VideoTrait {
enum : unsigned {
    rated = 1,        // follows a bit rate
    groups = 2,       // has groups of pictures
    reorders = 4,     // with B-frames
    interlaced = 8,   // codes fields
    setsFirst = 16,   // parameter sets come before each key frame in elementary form
    borrows = 32,     // copies a picture before it returns
    statsText = 64,   // statistics of a first pass are a text that the library hands over
    statsFile = 128,  // ... or files that it writes
    pixelAspect = 256,
    captions = 512,   // keeps caption data with its pictures
    keepsForm = 1024  // for masters and archives: takes the form that the input has
};
}

struct VideoCodec {
    const char* module;
    const char* standard;  // of several rows of one module; "" for the only one
    const char* encoder;   // the libraries' name
    std::span<const VideoForm> forms;
    const char* fourcc;
    const char* extension;
    unsigned traits;
    int least, most, step;  // sides of a picture, pixels
    double lowBits, highBits;
    double usualBits;     // 0: by quality
    const char* quality;  // name of the option, "" if there is none
    double usualQuality, mostQuality;
    const char *preset, *usualPreset;  // likewise
    const char* tune;
    int usualN, usualM, mostM;
    const char* options;  // always set, "name=value:..."
    const char* profile;  // the usual one of the codec; "" for the library's
    // Words of preset and tune, each between spaces, where the library finds out late. "": it is asked.
    const char* presetWords = "";
    const char* tuneWords = "";

    bool has(unsigned trait) const { return (traits & trait) != 0; }
    const VideoForm* form(unsigned fourcc) const;
    const AVCodec* library() const;  // null: it lacks this one
};

// The first of the module, or that of the standard; null if there is none.
const VideoCodec* videoCodec(const char* module, const char* standard = nullptr);

}  // namespace av
