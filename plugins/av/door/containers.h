// The multiplexers of the plug-in by name. What their containers hold is in plugins/av/mux/containers.cpp, a
// row for each of these in the same order.
#pragma once

#include <array>

namespace av {

struct MuxerModule {
    const char* name;
    const char* description;
    const char* displayName;
    const char* extensions;  // of files, separated by spaces; the first is the usual one
    bool transportStream = false;
};

// clang-format off
inline constexpr auto muxerModules = std::to_array<MuxerModule>({
    {"mp4mux",    "MPEG-4 file multiplexer",         "MP4",            "mp4 m4v m4a 3gp mov"},
    {"movmux",    "QuickTime file multiplexer",      "QuickTime",      "mov"},
    {"mkvmux",    "Matroska multiplexer",            "Matroska",       "mkv mka"},
    {"webmmux",   "WebM multiplexer",                "WebM",           "webm weba"},
    {"mxfmux",    "MXF multiplexer",                 "MXF",            "mxf"},
    {"mptsmux",   "MPEG transport stream multiplexer", "MPEG-TS",      "ts m2ts mts", true},
    {"mpegpsmux", "MPEG program stream multiplexer", "MPEG-PS",        "mpg vob mpeg"},
    {"dvmux",     "DV stream multiplexer",           "DV",             "dv"},
    {"dvavimux",  "AVI multiplexer",                 "AVI",            "avi"},
    {"y4mmux",    "YUV4MPEG2 multiplexer",           "YUV4MPEG2",      "y4m"},
    {"flacmux",   "FLAC file multiplexer",           "FLAC",           "flac"},
    {"oggmux",    "Ogg multiplexer",                 "Ogg",            "ogg oga opus"},
});
// clang-format on

}  // namespace av
