#include "core/preset/tables/presetfamilies_p.h"

#include <algorithm>
#include <iterator>

#include "core/preset/tables/profilesymbols_p.h"

namespace {

using profileScheme::named;

constexpr ModuleRow any = {};  // see PresetFamily

// Video. The first that is installed is the default.
constexpr ModuleRow h264 = {"bch264venc", "h264venc", "h264mfxvenc"};
constexpr ModuleRow gpu = {"h264cudavenc", "h264openclvenc"};
constexpr ModuleRow svc = {"svcvenc"};
constexpr ModuleRow mpeg = {"mpegvenc"};
constexpr ModuleRow mpeg4 = {"mpeg4venc"};
constexpr ModuleRow vc1 = {"vc1venc"};
constexpr ModuleRow vc3 = {"vc3venc"};
constexpr ModuleRow dv = {"dvvenc", "dv100venc"};
constexpr ModuleRow jpeg2000 = {"mj2kvenc"};
constexpr ModuleRow divx = {"divxvenc"};
constexpr ModuleRow divxPlus = {"divxh264venc"};
constexpr ModuleRow mvc = {"mvcvenc"};
constexpr ModuleRow raw = {"rawvenc"};

// Audio
constexpr ModuleRow aac = {"aacaenc", "rawaenc"};
constexpr ModuleRow mobile = {"aacaenc", "amraenc", "rawaenc"};
constexpr ModuleRow broad = {"aacaenc", "ddproaenc", "ddplusproaenc", "mpegpcmenc", "mpegaenc", "rawaenc"};
constexpr ModuleRow camera = {"ddproaenc", "ddplusproaenc", "mpegpcmenc", "rawaenc"};
constexpr ModuleRow dolby = {"ddproaenc", "ddplusproaenc", "ddaenc", "mpegaenc", "aacaenc", "rawaenc"};
constexpr ModuleRow layers = {"mpegaenc", "mpegpcmenc", "aacaenc", "ddproaenc", "ddplusproaenc", "rawaenc"};
constexpr ModuleRow dummy = {"dummyaenc"};
constexpr ModuleRow dummyOrPcm = {"dummyaenc", "mpegpcmenc"};
constexpr ModuleRow samples = {"rawaenc"};

// Multiplexers. Those that take none of the video encoders that are installed drop out.
constexpr ModuleRow elementary = {"rawmux"};
constexpr ModuleRow mp4 = {"mp4mux", "rawmux"};
constexpr ModuleRow ts = {"mptsmux", "rawmux"};
constexpr ModuleRow ps = {"mpegpsmux", "rawmux"};
constexpr ModuleRow mxf = {"mxfmux", "rawmux"};
constexpr ModuleRow asf = {"asfmux", "rawmux"};
constexpr ModuleRow mp4TsPs = {"mp4mux", "mptsmux", "mpegpsmux", "rawmux"};
constexpr ModuleRow tsPsMp4 = {"mptsmux", "mpegpsmux", "mp4mux", "rawmux"};
constexpr ModuleRow dif = {"dvmux", "dv100mux"};
constexpr ModuleRow dvAvi = {"dvavimux"};
constexpr ModuleRow avi = {"rawavimux"};

// clang-format off
constexpr PresetFamily families[] = {
    {h264,     aac,        mp4,        {{named("PSP_H264_640x480"),          "PSP H.264 Highest Resolution"},
                                        {named("PSP_H264_480x270"),          "PSP H.264 High Resolution"},
                                        {named("PSP_H264_320x240"),          "PSP H.264 Low Resolution"},
                                        {named("IPOD_H264_640x480"),         "iPod H.264 High Resolution"},
                                        {named("IPOD_H264_320x240"),         "iPod H.264 Low Resolution"}}},
    {h264,     mobile,     mp4,        {{named("3GP_H264"),                  "3GP H.264"}}},
    {h264,     aac,        mp4,        {{named("FLASH_LOW"),                 "Adobe Flash (Low Resolution Web Content)"},
                                        {named("FLASH_HIGH"),                "Adobe Flash (High Resolution Web Content)"}}},
    {svc,      aac,        elementary, {{named("SVC"),                       "H.264 / SVC"}}},
    {gpu,      aac,        mp4TsPs,    {{named("GPU"),                       "H.264 @ GPU"}}},
    {h264,     broad,      mp4TsPs,    {{named("H264_BASELINE"),             "H.264 Baseline"},
                                        {named("H264_MAIN"),                 "H.264 Main"},
                                        {named("H264_HIGH"),                 "H.264 High"},
                                        {named("H264_QT"),                   "H.264 QuickTime compliant"}}},
    {h264,     camera,     ts,         {{named("AVCHD"),                     "AVCHD"}}},
    {mpeg,     layers,     tsPsMp4,    {{named("MPEG2_422"),                 "MPEG-2 422"},
                                        {named("MPEG2_SIMPLE"),              "MPEG-2 Simple"},
                                        {named("MPEG2_MAIN"),                "MPEG-2 Main"},
                                        {named("MPEG2_HIGH"),                "MPEG-2 High"},
                                        {named("MPEG2_HIGH_1440"),           "MPEG-2 High 1440"},
                                        {named("MPEG1"),                     "MPEG-1"}}},
    {mpeg4,    aac,        mp4,        {{named("PSP_MPEG4_320x240"),         "PSP MPEG-4 Low Resolution"},
                                        {named("IPOD_MPEG4_320x240"),        "iPod MPEG-4 Low Resolution"},
                                        {named("IPOD_MPEG4_640x480"),        "iPod MPEG-4 High Resolution"},
                                        {named("3GP_H263"),                  "3GP H.263"},
                                        {named("3GP_MPEG4"),                 "3GP MPEG-4"},
                                        {named("MPEG4_HD"),                  "MPEG-4 HD"},
                                        {named("MPEG4_SD"),                  "MPEG-4 SD"}}},
    {h264,     camera,     ts,         {{named("BD_H264_HDMV"),              "BD H.264 High Resolution"},
                                        {named("BD_H264"),                   "BD H.264 Low Resolution"}}},
    {mpeg,     camera,     ts,         {{named("BD_MPEG_HDMV"),              "BD MPEG-2 High Resolution"},
                                        {named("BD_MPEG"),                   "BD MPEG-2 Low Resolution"}}},
    {vc1,      any,        ts,         {{named("BD_VC1_HDMV"),               "BD VC-1 High Resolution"},
                                        {named("BD_VC1"),                    "BD VC-1 Low Resolution"}}},
    {vc1,      any,        any,        {{named("VC1_BASELINE"),              "VC-1 Simple"},
                                        {named("VC1_MAIN"),                  "VC-1 Main"},
                                        {named("VC1_HIGH"),                  "VC-1 Advanced"}}},
    {mpeg,     any,        ps,         {{named("DVD"),                       "MPEG-2 DVD"},
                                        {named("SVCD"),                      "MPEG-2 SuperVCD"},
                                        {named("VCD"),                       "MPEG-1 VideoCD"}}},
    {dv,       dummy,      dif,        {{named("DV"),                        "DV"},
                                        {named("DVCPRO25"),                  "DVCPRO 25"},
                                        {named("DVCPRO50"),                  "DVCPRO 50"},
                                        {named("DVCPRO100_720p"),            "DVCPRO HD 100 720p"},
                                        {named("DVCPRO100_1080i"),           "DVCPRO HD 100 1080i"},
                                        {named("DVCPRO100_720p_NATIVE"),     "DVCPRO HD 100 720p Native"}}},
    {dv,       dummy,      dvAvi,      {{named("DVAVI_DV"),                  "AVI DV"},
                                        {named("DVAVI_DVCPRO25"),            "AVI DVCPRO 25"},
                                        {named("DVAVI_DVCPRO50"),            "AVI DVCPRO 50"},
                                        {named("DVAVI_DVCPRO100_720p"),      "AVI DVCPRO HD 100 720p"},
                                        {named("DVAVI_DVCPRO100_1080i"),     "AVI DVCPRO HD 100 1080i"}}},
    {dv,       dummy,      dif,        {{named("DVCAM"),                     "DVCAM"}}},
    {dv,       dummyOrPcm, mxf,        {{named("P2_DVCPRO25"),               "P2 DVCPRO 25"},
                                        {named("P2_DVCPRO50"),               "P2 DVCPRO 50"},
                                        {named("P2_DVCPRO100_720p"),         "P2 DVCPRO HD 100 720p"},
                                        {named("P2_DVCPRO100_1080i"),        "P2 DVCPRO HD 100 1080i"},
                                        {named("P2_DVCPRO100_720p_NATIVE"),  "P2 DVCPRO HD 100 720p Native"}}},
    {jpeg2000, any,        any,        {{named("DCI_LOSSY"),                 "JPEG2000 Lossy"},
                                        {named("DCI_LOSSLESS"),              "JPEG2000 Lossless"},
                                        {named("DCI_2K"),                    "DigitalCinema 2K"},
                                        {named("DCI_4K"),                    "DigitalCinema 4K"}}},
    {mpeg,     any,        mxf,        {{named("XDCAM_IMX_30"),              "XDCAM IMX 30Mbps"},
                                        {named("XDCAM_IMX_40"),              "XDCAM IMX 40Mbps"},
                                        {named("XDCAM_IMX_50"),              "XDCAM IMX 50Mbps"}}},
    {divx,     any,        any,        {{named("DIVX6_QMOBILE"),             "DivX qMobileProfile"},
                                        {named("DIVX6_MOBILE"),              "DivX Mobile Profile"},
                                        {named("DIVX6_HOME_THEATER"),        "DivX Home Theater Profile"},
                                        {named("DIVX6_HDTV"),                "DivX HD - 720p Profile"},
                                        {named("DIVX6_1080"),                "DivX HD - 1080p Profile"}}},
    {divxPlus, any,        any,        {{named("DIVX7_HD_PLUS"),             "DivX Plus HD Profile"},
                                        {named("DIVX7_DPS_SD"),              "DivX Plus DPS SD"},
                                        {named("DIVX7_DPS_HD"),              "DivX Plus DPS HD"}}},
    {mpeg,     any,        mp4,        {{named("XDCAM_EX_1920"),             "XDCAM EX 1920 35Mbps VBR"},
                                        {named("XDCAM_EX_1440"),             "XDCAM EX 1440 25Mbps CBR"},
                                        {named("XDCAM_EX_1280"),             "XDCAM EX 1280 35Mbps VBR"}}},
    {mpeg,     any,        mxf,        {{named("XDCAM_HD_422_1920"),         "XDCAM HD 4:2:2 1920x1080 CBR 50Mbps"},
                                        {named("XDCAM_HD_420_1440_CBR_25"),  "XDCAM HD 4:2:0 1440x1080 CBR 25Mbps"},
                                        {named("XDCAM_HD_420_1440_VBR_17_5"), "XDCAM HD 4:2:0 1440x1080 VBR 17.5Mbps"},
                                        {named("XDCAM_HD_420_1440_VBR_35"),  "XDCAM HD 4:2:0 1440x1080 VBR 35Mbps"},
                                        {named("XDCAM_HD_420_1280"),         "XDCAM HD 4:2:0 1280x720 VBR 35Mbps"},
                                        {named("XDCAM_HD_422_1280"),         "XDCAM HD 4:2:2 1280x720 CBR 50Mbps"},
                                        {named("XDCAM_HD_420_540_12_5"),     "XDCAM 4:2:0 1440x540 CBR 12.5Mbps"},
                                        {named("XDCAM_HD_420_540_8_75"),     "XDCAM 4:2:0 1440x540 VBR 8.75Mbps"},
                                        {named("XDCAM_HD_420_540_17_5"),     "XDCAM 4:2:0 1440x540 VBR 17.5Mbps"}}},
    {h264,     any,        mxf,        {{named("AVCINTRA_50"),               "AVC-Intra 50"},
                                        {named("AVCINTRA_100"),              "AVC-Intra 100"}}},
    {mpeg,     any,        ts,         {{named("DTV_DVB_SD"),                "DVB SD"},
                                        {named("DTV_DVB_HD"),                "DVB HD"}}},
    {mpeg,     dolby,      ts,         {{named("DTV_ATSC_HD"),               "ATSC HD"},
                                        {named("DTV_ATSC_SD"),               "ATSC SD"}}},
    {mpeg,     any,        ts,         {{named("HDV_HD1"),                   "HDV HD1"},
                                        {named("HDV_HD2"),                   "HDV HD2"}}},
    {raw,      samples,    elementary, {{named("RAW"),                       "RAW/YUV"}}},
    {raw,      samples,    avi,        {{named("AVI_RAW"),                   "Uncompressed AVI"}}},
    {h264,     any,        asf,        {{named("SILVERLIGHT_H264"),          "Silverlight H.264"}}},
    {vc1,      any,        asf,        {{named("SILVERLIGHT_VC1"),           "Silverlight VC-1"}}},
    {mvc,      any,        any,        {{named("MVC_BD_3D"),                 "MVC Blu-ray 3D"}}},
    {vc3,      any,        mxf,        {{named("VC3_GENERIC"),               "VC-3 Generic"}}},
};
// clang-format on

constexpr std::size_t countPresets() {
    std::size_t count = 0;
    for (const PresetFamily& family : families)
        for (const FamilyMember& member : family.members) count += member.name != nullptr;
    return count;
}
static_assert(countPresets() == 98);

}  // namespace

std::span<const FamilyMember> PresetFamily::presets() const {
    const auto* last = std::find_if(std::begin(members), std::end(members),
                                    [](const FamilyMember& member) { return !member.name; });
    return {members, last};
}

std::span<const PresetFamily> qvPresetFamilies() { return families; }
