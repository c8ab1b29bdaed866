#include "tarsel/presets/extensions.h"

#include <algorithm>

namespace {

// clang-format off
constexpr PresetExtension kExtensions[] = {
    {"mp4",  "mp4mux",    {"H.264 for the web", "H264_HIGH", "MPEG4_HD"}},
    {"m4v",  "mp4mux",    {"H264_HIGH", "MPEG4_HD"}},
    {"mov",  "movmux",    {"H.264 in QuickTime", "H264_QT"}, "mp4mux"},
    {"f4v",  "mp4mux",    {"FLASH_HIGH"}},
    {"3gp",  "mp4mux",    {"3GP_H264", "3GP_MPEG4", "3GP_H263"}},
    {"ts",   "mptsmux",   {"H264_HIGH", "MPEG2_MAIN"}},
    {"m2t",  "mptsmux",   {"HDV_HD2", "MPEG2_MAIN"}},
    {"m2ts", "mptsmux",   {"BD_H264_HDMV", "BD_MPEG_HDMV", "BD_VC1_HDMV"}},
    {"mts",  "mptsmux",   {"AVCHD"}},
    {"mpg",  "mpegpsmux", {"MPEG2_MAIN", "MPEG1"}},
    {"mpeg", "mpegpsmux", {"MPEG2_MAIN", "MPEG1"}},
    {"vob",  "mpegpsmux", {"DVD"}},
    {"mxf",  "mxfmux",    {"XDCAM_HD_422_1920", "VC3_GENERIC", "AVCINTRA_100"}},
    {"dv",   "dv100mux",  {"DV", "DVCPRO50"}, "dvmux"},
    {"mj2",  "mj2mux",    {"DCI_LOSSY"}},
    {"wmv",  "asfmux",    {"VC1_MAIN", "SILVERLIGHT_VC1"}},
    {"asf",  "asfmux",    {"VC1_MAIN", "SILVERLIGHT_VC1"}},
    {"divx", "dmfmux",    {"DIVX6_HDTV"}},
    {"mkv",  "mkvmux",    {"H.264 in Matroska", "DIVX7_HD_PLUS"}},
    {"webm", "webmmux",   {"AV1"}},
    {"mp3",  "rawmux",    {"MP3"}},
    {"m4a",  "mp4mux",    {"AAC"}},
    {"aac",  "rawmux",    {"AAC"}},
    {"flac", "flacmux",   {"FLAC"}},
    {"opus", "oggmux",    {"Opus"}},
    {"265",  "rawmux",    {"H.265"}},
    {"hevc", "rawmux",    {"H.265"}},
    {"h264", "rawmux",    {"H264_HIGH"}},
    {"264",  "rawmux",    {"H264_HIGH"}},
    {"m2v",  "rawmux",    {"MPEG2_MAIN"}},
    {"m1v",  "rawmux",    {"MPEG1"}},
    {"vc1",  "rawmux",    {"VC1_HIGH"}},
    {"j2k",  "rawmux",    {"DCI_LOSSY"}},
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
