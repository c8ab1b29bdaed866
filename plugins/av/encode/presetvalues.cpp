#include "plugins/av/encode/presetvalues.h"

#include <cstring>

#include "core/measure/fourcc.h"
#include "core/preset/qvprofile.h"
#include "plugins/av/door/ownpresets.h"

namespace av {

namespace {

using namespace QvFourcc;
constexpr const char* h264 = "h264venc";
constexpr const char* mpeg = "mpegvenc";
constexpr const char* mpeg1 = "MPEG-1";
constexpr const char* mpeg2 = "MPEG-2";
constexpr const char* mpeg4 = "MPEG-4";
constexpr const char* h263 = "H.263";
constexpr double tv = 4.0 / 3, wide = 16.0 / 9;
// Fields are coded as such, and quantisers rise as fast as broadcasting wants.
constexpr const char* imx50 =
    "flags=+low_delay:intra_vlc=1:non_linear_quant=1:dc=10:qmin=1:qmax=3:bufsize=2000000:rc_init_occupancy="
    "2000000";
constexpr const char* imx40 =
    "flags=+low_delay:intra_vlc=1:non_linear_quant=1:dc=10:qmin=1:qmax=8:bufsize=1600000:rc_init_occupancy="
    "1600000";
constexpr const char* imx30 =
    "flags=+low_delay:intra_vlc=1:non_linear_quant=1:dc=10:qmin=1:qmax=8:bufsize=1200000:rc_init_occupancy="
    "1200000";
constexpr const char* xdcam = "non_linear_quant=1:qmax=28:dc=10:intra_vlc=1:bufsize=17825792";

// Digital cinema: 250 Mbit/s at most.
// clang-format off
constexpr PresetVideo rows[] = {
    // preset            module standard  size      tv   60   rate int aspect  target  most   N   M  type  profile     top options
    {"H264_BASELINE",      h264, "",    0, 0,       false, 0,   0,  0, 0,      0, 0,          0,  1, I420, "baseline", 0,  ""},
    {"H264_MAIN",          h264, "",    0, 0,       false, 0,   0,  0, 0,      0, 0,          0,  0, I420, "main",     0,  ""},
    {"H264_HIGH",          h264, "",    0, 0,       false, 0,   0,  0, 0,      0, 0,          0,  0, I420, "high",     0,  ""},
    {"H264_QT",            h264, "",    0, 0,       false, 0,   0,  0, 0,      0, 0,          0,  0, I420, "main",     0,  ""},
    {"PSP_H264_640x480",   h264, "",    640, 480,   false, 0, 29.97, 0, 0,     1.5e6, 2e6,    0,  3, I420, "main",     0,  "level=30"},
    {"PSP_H264_480x270",   h264, "",    480, 270,   false, 0, 29.97, 0, 0,     768e3, 1.5e6,  0,  3, I420, "main",     0,  "level=30"},
    {"PSP_H264_320x240",   h264, "",    320, 240,   false, 0, 29.97, 0, 0,     512e3, 768e3,  0,  3, I420, "main",     0,  "level=21"},
    {"IPOD_H264_640x480",  h264, "",    640, 480,   false, 0, 29.97, 0, 0,     1.2e6, 1.5e6,  0,  1, I420, "baseline", 0,  "level=30"},
    {"IPOD_H264_320x240",  h264, "",    320, 240,   false, 0, 29.97, 0, 0,     512e3, 768e3,  0,  1, I420, "baseline", 0,  "level=13"},
    {"3GP_H264",           h264, "",    320, 240,   false, 0,   25, 0, 0,      384e3, 768e3,  0,  1, I420, "baseline", 0,  "level=13"},
    {"FLASH_LOW",          h264, "",    0, 0,       false, 0,   0,  0, 0,      500e3, 800e3,  0,  1, I420, "baseline", 0,  ""},
    {"FLASH_HIGH",         h264, "",    0, 0,       false, 0,   0,  0, 0,      2e6, 4e6,      0,  0, I420, "high",     0,  ""},
    {"BD_H264",            h264, "",    1920, 1080, false, 0, 25, 1, wide,     20e6, 30e6,   24,  3, I420, "high",     0,  "level=41:slices=4:bluray-compat=1"},
    {"BD_H264_HDMV",       h264, "",    1920, 1080, false, 0, 25, 1, wide,     20e6, 30e6,   24,  3, I420, "high",     0,  "level=41:slices=4:bluray-compat=1"},
    {"AVCHD",              h264, "",    1920, 1080, false, 0, 25, 1, wide,     16e6, 17e6,   12,  3, I420, "high",     0,  "level=40:slices=4:bluray-compat=1"},
    {"AVCINTRA_50",        h264, "",    1440, 1080, false, 0, 25, 1, wide,     50e6, 0,       1,  1, W016, "",         0,  "avcintra-class=50"},
    {"AVCINTRA_100",       h264, "",    1920, 1080, false, 0, 25, 1, wide,     100e6, 0,      1,  1, Y216, "",         0,  "avcintra-class=100"},
    {"MPEG1",              mpeg, mpeg1, 0, 0,       false, 0,   0,  0, 0,      1.15e6, 1.5e6, 15, 3, I420, "",         0,  ""},
    {"VCD",                mpeg, mpeg1, 352, 288,   true, 240,  25, 0, tv,     1.15e6, 0,     15, 3, I420, "",         0,  "bufsize=327680"},
    {"SVCD",               mpeg, mpeg2, 480, 576,   true, 480,  25, 1, tv,     2.5e6, 2.6e6,  15, 3, I420, "",         0,  "bufsize=917504"},
    {"DVD",                mpeg, mpeg2, 720, 576,   true, 480,  25, 1, tv,     6e6, 9e6,      12, 3, I420, "main",     0,  "bufsize=1835008"},
    {"MPEG2_SIMPLE",       mpeg, mpeg2, 0, 0,       false, 0,   0,  0, 0,      6e6, 9e6,      12, 1, I420, "simple",   0,  ""},
    {"MPEG2_MAIN",         mpeg, mpeg2, 0, 0,       false, 0,   0,  0, 0,      8e6, 12e6,     12, 3, I420, "main",     0,  ""},
    {"MPEG2_HIGH_1440",    mpeg, mpeg2, 0, 0,       false, 0,   0,  0, 0,      30e6, 50e6,    12, 3, I420, "main",     0,  "level=6"},
    {"MPEG2_HIGH",         mpeg, mpeg2, 0, 0,       false, 0,   0,  0, 0,      30e6, 60e6,    12, 3, I420, "main",     0,  "level=4"},
    {"MPEG2_422",          mpeg, mpeg2, 0, 0,       false, 0,   0,  0, 0,      50e6, 0,       12, 3, YUYV, "422",      0,  ""},
    {"DTV_DVB_SD",         mpeg, mpeg2, 720, 576,   false, 0,   25, 1, tv,     6e6, 9e6,      12, 3, I420, "main",     0,  ""},
    {"DTV_DVB_HD",         mpeg, mpeg2, 1920, 1080, false, 0,   25, 1, wide,   18e6, 24e6,    12, 3, I420, "main",     0,  ""},
    {"DTV_ATSC_SD",        mpeg, mpeg2, 704, 480,   false, 0, 29.97, 1, tv,    6e6, 9e6,      15, 3, I420, "main",     0,  ""},
    {"DTV_ATSC_HD",        mpeg, mpeg2, 1920, 1080, false, 0, 29.97, 1, wide,  16e6, 19e6,    15, 3, I420, "main",     0,  ""},
    {"HDV_HD1",            mpeg, mpeg2, 1280, 720,  false, 0,   25, 0, wide,   19.7e6, 0,     12, 3, I420, "main",     0,  "bufsize=7340032"},
    {"HDV_HD2",            mpeg, mpeg2, 1440, 1080, false, 0,   25, 1, wide,   25e6, 0,       12, 3, I420, "main",     0,  "bufsize=7340032"},
    {"BD_MPEG",            mpeg, mpeg2, 1920, 1080, false, 0,   25, 1, wide,   25e6, 35e6,    12, 3, I420, "main",     0,  ""},
    {"BD_MPEG_HDMV",       mpeg, mpeg2, 1920, 1080, false, 0,   25, 1, wide,   25e6, 35e6,    12, 3, I420, "main",     0,  ""},
    {"XDCAM_IMX_30",       mpeg, mpeg2, 720, 608,   true, 512,  25, 1, tv,     30e6, 0,        1, 1, YUYV, "422",     32,  imx30},
    {"XDCAM_IMX_40",       mpeg, mpeg2, 720, 608,   true, 512,  25, 1, tv,     40e6, 0,        1, 1, YUYV, "422",     32,  imx40},
    {"XDCAM_IMX_50",       mpeg, mpeg2, 720, 608,   true, 512,  25, 1, tv,     50e6, 0,        1, 1, YUYV, "422",     32,  imx50},
    {"XDCAM_EX_1920",      mpeg, mpeg2, 1920, 1080, false, 0,   25, 1, wide,   30e6, 35e6,    12, 3, I420, "main",     0,  xdcam},
    {"XDCAM_EX_1440",      mpeg, mpeg2, 1440, 1080, false, 0,   25, 1, wide,   25e6, 0,       12, 3, I420, "main",     0,  xdcam},
    {"XDCAM_EX_1280",      mpeg, mpeg2, 1280, 720,  false, 0,   50, 0, wide,   30e6, 35e6,    12, 3, I420, "main",     0,  xdcam},
    {"XDCAM_HD_422_1920",  mpeg, mpeg2, 1920, 1080, false, 0,   25, 1, wide,   50e6, 0,       12, 3, YUYV, "422",      0,  xdcam},
    {"XDCAM_HD_422_1280",  mpeg, mpeg2, 1280, 720,  false, 0,   50, 0, wide,   50e6, 0,       12, 3, YUYV, "422",      0,  xdcam},
    {"XDCAM_HD_420_1440_CBR_25", mpeg, mpeg2, 1440, 1080, false, 0, 25, 1, wide, 25e6, 0,     12, 3, I420, "main",     0,  xdcam},
    {"XDCAM_HD_420_1440_VBR_17_5", mpeg, mpeg2, 1440, 1080, false, 0, 25, 1, wide, 15e6, 17.5e6, 12, 3, I420, "main",  0,  xdcam},
    {"XDCAM_HD_420_1440_VBR_35", mpeg, mpeg2, 1440, 1080, false, 0, 25, 1, wide, 30e6, 35e6,  12, 3, I420, "main",     0,  xdcam},
    {"XDCAM_HD_420_1280",  mpeg, mpeg2, 1280, 720,  false, 0,   50, 0, wide,   30e6, 35e6,    12, 3, I420, "main",     0,  xdcam},
    {"XDCAM_HD_420_540_12_5", mpeg, mpeg2, 1440, 540, false, 0, 25, 0, wide,   12.5e6, 0,     12, 3, I420, "main",     0,  xdcam},
    {"XDCAM_HD_420_540_8_75", mpeg, mpeg2, 1440, 540, false, 0, 25, 0, wide,   7.5e6, 8.75e6, 12, 3, I420, "main",     0,  xdcam},
    {"XDCAM_HD_420_540_17_5", mpeg, mpeg2, 1440, 540, false, 0, 25, 0, wide,   15e6, 17.5e6,  12, 3, I420, "main",     0,  xdcam},
    {"3GP_MPEG4", "mpeg4venc", mpeg4,      176, 144,   false, 0,   15, 0, tv,     96e3, 128e3,   0, 1, I420, "",         0,  ""},
    {"3GP_H263",  "mpeg4venc", h263,    176, 144,   false, 0,   15, 0, tv,     96e3, 128e3,   0, 1, I420, "",         0,  ""},
    {"MPEG4_SD",     "mpeg4venc", mpeg4,   0, 0,       false, 0,   0,  0, 0,      2e6, 4e6,       0, 2, I420, "",         0,  ""},
    {"MPEG4_HD",     "mpeg4venc", mpeg4,   0, 0,       false, 0,   0,  0, 0,      6e6, 10e6,      0, 2, I420, "",         0,  ""},
    {"PSP_MPEG4_320x240", "mpeg4venc", mpeg4, 320, 240, false, 0, 29.97, 0, 0,    512e3, 768e3,   0, 1, I420, "",         0,  ""},
    {"IPOD_MPEG4_640x480", "mpeg4venc", mpeg4, 640, 480, false, 0, 29.97, 0, 0,   1.5e6, 2.5e6,   0, 1, I420, "",         0,  ""},
    {"IPOD_MPEG4_320x240", "mpeg4venc", mpeg4, 320, 240, false, 0, 29.97, 0, 0,   512e3, 768e3,   0, 1, I420, "",         0,  ""},
    {"DV",            "dvvenc", "",     720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "25",       0,  ""},
    {"DVCAM",         "dvvenc", "",     720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "25",       0,  ""},
    {"DVAVI_DV",      "dvvenc", "",     720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "25",       0,  ""},
    {"DVCPRO25",      "dvvenc", "",     720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "dvcpro25", 0,  ""},
    {"DVAVI_DVCPRO25", "dvvenc", "",    720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "dvcpro25", 0,  ""},
    {"P2_DVCPRO25",   "dvvenc", "",     720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "dvcpro25", 0,  ""},
    {"DVCPRO50",      "dvvenc", "",     720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "50",       0,  ""},
    {"DVAVI_DVCPRO50", "dvvenc", "",    720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "50",       0,  ""},
    {"P2_DVCPRO50",   "dvvenc", "",     720, 576,   true, 480,  25, 2, tv,     0, 0,           0, 0, YUYV, "50",       0,  ""},
    {"DVCPRO100_720p", "dv100venc", "", 960, 720,   false, 0,   50, 0, wide,   0, 0,           0, 0, YUYV, "100",      0,  ""},
    {"DVCPRO100_1080i", "dv100venc", "", 1440, 1080, false, 0,  25, 1, wide,   0, 0,           0, 0, YUYV, "100",      0,  ""},
    {"DVAVI_DVCPRO100_720p", "dv100venc", "", 960, 720, false, 0, 50, 0, wide, 0, 0,           0, 0, YUYV, "100",      0,  ""},
    {"DVAVI_DVCPRO100_1080i", "dv100venc", "", 1440, 1080, false, 0, 25, 1, wide, 0, 0,        0, 0, YUYV, "100",      0,  ""},
    {"DVCPRO100_720p_NATIVE", "dv100venc", "", 960, 720, false, 0, 50, 0, wide, 0, 0,          0, 0, YUYV, "100",      0,  ""},
    {"P2_DVCPRO100_720p", "dv100venc", "", 960, 720,   false, 0,   50, 0, wide,   0, 0,           0, 0, YUYV, "100",      0,  ""},
    {"P2_DVCPRO100_720p_NATIVE", "dv100venc", "", 960, 720, false, 0, 50, 0, wide, 0, 0,          0, 0, YUYV, "100",      0,  ""},
    {"P2_DVCPRO100_1080i", "dv100venc", "", 1440, 1080, false, 0,  25, 1, wide,   0, 0,           0, 0, YUYV, "100",      0,  ""},
    {"DCI_2K",       "mj2kvenc", "",    2048, 1080, false, 0,   24, 0, 0,      0, 0,           0, 0, b64a, "",         0,  "layer_rates=12"},
    {"DCI_4K",       "mj2kvenc", "",    4096, 2160, false, 0,   24, 0, 0,      0, 0,           0, 0, b64a, "",         0,  "layer_rates=45"},
    {"DCI_LOSSLESS", "mj2kvenc", "",    0, 0,       false, 0,   0,  0, 0,      0, 0,           0, 0, YUYV, "",         0,  "pred=dwt53"},
};
// clang-format on

}  // namespace

const PresetVideo* presetVideo(int profile, const char* module) {
    const char* symbol = qvProfileToSym(profile);
    if (!*symbol) symbol = ownPresetSymbol(profile);
    // The encoder of DVCPRO HD is also the other one of tapes with another type.
    const bool tape = std::strcmp(module, "dvvenc") == 0;
    for (const PresetVideo& row : rows)
        if (std::strcmp(row.preset, symbol) == 0 &&
            (std::strcmp(row.module, module) == 0 || (tape && std::strcmp(row.module, "dv100venc") == 0)))
            return &row;
    return nullptr;
}

}  // namespace av
