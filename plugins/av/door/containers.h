// The multiplexers of the plug-in by name. What their containers hold is in plugins/av/mux/containers.cpp, a
// row for each of these in the same order.
#pragma once

#include <array>

namespace av {

inline constexpr const char* recorderModule = "unitmux";

struct MuxerModule {
    const char* name;
    const char* description;
    const char* displayName;
    const char* extensions;  // of files, separated by spaces; the first is the usual one
    const char* encoders;    // modules whose streams it takes, likewise
    bool transportStream = false;
    int samplerate = 0;  // the only rate of sound that it holds; 0: any
};

// clang-format off
inline constexpr auto muxerModules = std::to_array<MuxerModule>({
    {"mp4mux", "MPEG-4 file multiplexer", "MP4", "mp4 m4v m4a 3gp mov",
     "h264venc h265venc av1venc mpegvenc mpeg4venc aacaenc mp3aenc ddaenc ddproaenc ddplusproaenc flacaenc opusaenc mpegpcmenc"},
    {"movmux", "QuickTime file multiplexer", "QuickTime", "mov",
     "h264venc h265venc mpegvenc mpeg4venc vc3venc dvvenc dv100venc mj2kvenc proresvenc rawvenc aacaenc mp3aenc ddaenc ddproaenc ddplusproaenc mpegpcmenc rawaenc"},
    {"mkvmux", "Matroska multiplexer", "Matroska", "mkv mka",
     "h264venc h265venc av1venc mpegvenc mpeg4venc vc3venc dvvenc dv100venc mj2kvenc proresvenc ffv1venc rawvenc aacaenc mpegaenc mp3aenc ddaenc ddproaenc ddplusproaenc flacaenc opusaenc mpegpcmenc rawaenc"},
    {"webmmux", "WebM multiplexer", "WebM", "webm weba",
     "av1venc opusaenc"},
    {"mxfmux", "MXF multiplexer", "MXF", "mxf",
     "mpegvenc vc3venc dvvenc dv100venc mj2kvenc proresvenc mpegpcmenc rawaenc", false, 48000},
    {"mptsmux", "MPEG transport stream multiplexer", "MPEG-TS", "ts m2ts mts",
     "h264venc h265venc mpegvenc mpeg4venc aacaenc mpegaenc mp3aenc ddaenc ddproaenc ddplusproaenc opusaenc", true},
    {"mpegpsmux", "MPEG program stream multiplexer", "MPEG-PS", "mpg vob mpeg",
     "h264venc mpegvenc mpegaenc mp3aenc ddaenc ddproaenc mpegpcmenc rawaenc"},
    {"dvmux", "DV stream multiplexer", "DV", "dv",
     "dvvenc dv100venc mpegpcmenc rawaenc", false, 48000},
    {"dvavimux", "AVI multiplexer", "AVI", "avi",
     "dvvenc dv100venc mpeg4venc ffv1venc rawvenc mpegaenc mp3aenc ddaenc ddproaenc mpegpcmenc rawaenc"},
    {"y4mmux", "YUV4MPEG2 multiplexer", "YUV4MPEG2", "y4m",
     "rawvenc"},
    {"flacmux", "FLAC file multiplexer", "FLAC", "flac",
     "flacaenc"},
    {"oggmux", "Ogg multiplexer", "Ogg", "ogg oga opus",
     "flacaenc opusaenc"},
});
// clang-format on

}  // namespace av
