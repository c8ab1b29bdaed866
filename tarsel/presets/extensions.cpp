#include "tarsel/presets/extensions.h"

#include <algorithm>

namespace {

// clang-format off
constexpr PresetExtension kExtensions[] = {
    {"mp4",  "mp4mux",    "h264",     "aac",  {"H.264 for the web", "H264_HIGH", "MPEG4_HD"}},
    {"m4v",  "mp4mux",    "h264",     "aac",  {"H264_HIGH", "MPEG4_HD"}},
    {"mov",  "movmux",    "h264",     "aac",  {"H.264 in QuickTime", "H264_QT"}, "mp4mux"},
    {"f4v",  "mp4mux",    "h264",     "aac",  {"FLASH_HIGH"}},
    {"3gp",  "mp4mux",    "h264",     "aac",  {"3GP_H264", "3GP_MPEG4", "3GP_H263"}},
    {"ts",   "mptsmux",   "h264",     "aac",  {"H264_HIGH", "MPEG2_MAIN"}},
    {"m2t",  "mptsmux",   "mpeg2",    "mp2",  {"HDV_HD2", "MPEG2_MAIN"}},
    {"m2ts", "mptsmux",   "h264",     "ac3",  {"BD_H264_HDMV", "BD_MPEG_HDMV", "BD_VC1_HDMV"}},
    {"mts",  "mptsmux",   "h264",     "ac3",  {"AVCHD"}},
    {"mpg",  "mpegpsmux", "mpeg2",    "mp2",  {"MPEG2_MAIN", "MPEG1"}},
    {"mpeg", "mpegpsmux", "mpeg2",    "mp2",  {"MPEG2_MAIN", "MPEG1"}},
    {"vob",  "mpegpsmux", "mpeg2",    "ac3",  {"DVD"}},
    {"mxf",  "mxfmux",    "mpeg2",    "pcm",  {"XDCAM_HD_422_1920", "VC3_GENERIC", "AVCINTRA_100"}},
    {"dv",   "dv100mux",  "dv",       "pcm",  {"DV", "DVCPRO50"}, "dvmux"},
    {"mj2",  "mj2mux",    "jpeg2000", "pcm",  {"DCI_LOSSY"}},
    {"wmv",  "asfmux",    "vc1",      "wma",  {"VC1_MAIN", "SILVERLIGHT_VC1"}},
    {"asf",  "asfmux",    "vc1",      "wma",  {"VC1_MAIN", "SILVERLIGHT_VC1"}},
    {"divx", "dmfmux",    "mpeg4",    "mp3",  {"DIVX6_HDTV"}},
    {"mkv",  "mkvmux",    "h264",     "aac",  {"H.264 in Matroska", "DIVX7_HD_PLUS"}},
    {"webm", "webmmux",   "av1",      "opus", {"AV1"}},
    {"avi",  "dvavimux",  "mpeg4",    "mp3"},
    {"h264", "rawmux",    "h264",     "aac",  {"H264_HIGH"}},
    {"264",  "rawmux",    "h264",     "aac",  {"H264_HIGH"}},
    {"h265", "rawmux",    "h265",     "aac",  {"H.265"}},
    {"265",  "rawmux",    "h265",     "aac",  {"H.265"}},
    {"hevc", "rawmux",    "h265",     "aac",  {"H.265"}},
    {"m2v",  "rawmux",    "mpeg2",    "mp2",  {"MPEG2_MAIN"}},
    {"m1v",  "rawmux",    "mpeg1",    "mp2",  {"MPEG1"}},
    {"vc1",  "rawmux",    "vc1",      "pcm",  {"VC1_HIGH"}},
    {"j2k",  "rawmux",    "jpeg2000", "pcm",  {"DCI_LOSSY"}},
    {"y4m",  "y4mmux",    "raw",      nullptr, {}, nullptr, "I420"},
    {"m4a",  "mp4mux",    nullptr,    "aac", {"AAC"}},
    {"mka",  "mkvmux",    nullptr,    "aac"},
    {"flac", "flacmux",   nullptr,    "flac", {"FLAC"}},
    {"opus", "oggmux",    nullptr,    "opus", {"Opus"}},
    {"ogg",  "oggmux",    nullptr,    "opus"},
    {"oga",  "oggmux",    nullptr,    "flac"},
    {"mp3",  "rawmux",    nullptr,    "mp3", {"MP3"}},
    {"aac",  "rawmux",    nullptr,    "aac", {"AAC"}},
    {"ac3",  "rawmux",    nullptr,    "ac3"},
    {"eac3", "rawmux",    nullptr,    "eac3"},
    {"mp2",  "rawmux",    nullptr,    "mp2"},
};
// clang-format on

}  // namespace

std::span<const PresetExtension> presetExtensions() { return kExtensions; }

const PresetExtension* presetExtension(std::string_view extension) {
    const auto* const found =
        std::find_if(std::begin(kExtensions), std::end(kExtensions),
                     [&](const PresetExtension& row) { return row.extension == extension; });
    return found == std::end(kExtensions) ? nullptr : found;
}
