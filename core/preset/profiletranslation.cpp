// Current profile numbers for old descriptions of presets. One table for each kind of encoder; the type codes
// are those of the encoders' old presets.
#include <iterator>
#include <span>
#include <string_view>

#include "core/preset/qvprofile.h"
#include "core/preset/tables/profilesymbols_p.h"

namespace {

using profileScheme::named;
using profileScheme::second;

struct Row {
    int from;
    int profile;
};

// By the member number of the second scheme, for presets without an encoder's name.
constexpr Row byNumber[] = {
    {1, named("MPEG1")},
    {2, named("VCD")},
    {10, named("MPEG2_MAIN")},
    {12, named("DVD")},
    {13, named("DTV_ATSC_SD")},
    {15, named("HDV_HD1")},
    {16, named("MPEG2_HIGH")},
    {17, named("XDCAM_IMX_30")},
    {18, named("MPEG2_HIGH")},
    {19, named("MPEG2_HIGH_1440")},
    {20, named("XDCAM_IMX_30")},
    {21, named("XDCAM_HD_422_1920")},
    {22, named("XDCAM_EX_1280")},
    {31, named("PSP_H264_320x240")},
    {32, named("IPOD_H264_320x240")},
    {33, named("AVCHD")},
    {34, named("BD_H264")},
    {36, named("3GP_H264")},
    {37, named("FLASH_LOW")},
    {38, named("FLASH_HIGH")},
    {39, named("H264_QT")},
    {40, named("VC1_MAIN")},
    {41, named("BD_VC1")},
    {50, named("DV")},
    {51, named("DVCPRO25")},
    {52, named("DVCPRO50")},
    {53, named("DVCPRO100_720p")},
    {54, named("DVCAM")},
    {55, named("DVCPRO100_720p_NATIVE")},
    {60, named("DCI_LOSSY")},
    {61, named("DCI_2K")},
    {62, named("DCI_4K")},
    {70, named("MPEG4_SD")},
    {72, named("3GP_H263")},
    {73, named("PSP_MPEG4_320x240")},
    {74, named("IPOD_MPEG4_320x240")},
    {76, named("3GP_MPEG4")},
    {77, named("MPEG4_HD")},
    {90, named("DIVX6_QMOBILE")},
    {91, named("DIVX6_MOBILE")},
    {92, named("DIVX6_HOME_THEATER")},
    {93, named("DIVX6_HDTV")},
    {94, named("DIVX6_1080")},
    {95, named("DIVX7_HD_PLUS")},
    {101, named("RAW")},
    {110, named("AVCINTRA_100")},
    {111, named("AVCINTRA_50")},
};

constexpr Row jpeg2000[] = {
    {28672, named("DCI_LOSSLESS")},
    {28673, named("DCI_LOSSY")},
    {28928, named("DCI_2K")},
    {28929, named("DCI_4K")},
};

// By QvDvSettings::kind.
constexpr Row dv[] = {
    {1, named("DV")},
    {2, named("DVCPRO25")},
    {3, named("DVCPRO50")},
    {4, named("DVCPRO100_720p")},
    {5, named("DVCPRO100_1080i")},
};
constexpr Row dvAvi[] = {
    {1, named("DVAVI_DV")},
    {2, named("DVAVI_DVCPRO25")},
    {3, named("DVAVI_DVCPRO50")},
    {4, named("DVAVI_DVCPRO100_720p")},
    {5, named("DVAVI_DVCPRO100_1080i")},
};

constexpr Row vc1[] = {
    {0, named("VC1_BASELINE")}, {2, named("VC1_MAIN")},    {5, named("VC1_HIGH")},
    {8, named("BD_VC1")},       {9, named("BD_VC1_HDMV")},
};

// By the old number, which goes before the type.
constexpr Row mpeg4Numbers[] = {
    {second(0x4C), named("3GP_MPEG4")},
    {second(0x48), named("3GP_H263")},
};
constexpr Row mpeg4[] = {
    {11, named("MPEG4_SD")},          {13, named("MPEG4_SD")},           {14, named("MPEG4_HD")},
    {18, named("MPEG4_HD")},          {15, named("IPOD_MPEG4_320x240")}, {17, named("IPOD_MPEG4_640x480")},
    {16, named("PSP_MPEG4_320x240")},
};

constexpr Row h264Numbers[] = {
    {second(0x24), named("3GP_H264")},
    {second(0x25), named("H264_BASELINE")},
    {second(0x26), named("H264_MAIN")},
};
constexpr Row h264[] = {
    {0, named("H264_BASELINE")}, {1, named("H264_BASELINE")},      {2, named("H264_MAIN")},
    {4, named("H264_MAIN")},     {5, named("H264_HIGH")},          {6, named("H264_MAIN")},
    {8, named("BD_H264")},       {9, named("BD_H264_HDMV")},       {10, named("PSP_H264_320x240")},
    {11, named("H264_HIGH")},    {12, named("H264_HIGH")},         {13, named("IPOD_H264_320x240")},
    {14, named("AVCHD")},        {15, named("IPOD_H264_640x480")}, {18, named("AVCINTRA_50")},
    {19, named("AVCINTRA_100")}, {20, named("PSP_H264_480x270")},  {21, named("PSP_H264_640x480")},
};

constexpr Row mpeg[] = {
    {0, named("MPEG1")},
    {1, named("VCD")},
    {3, named("SVCD")},
    {4, named("DVD")},
    {8, named("DTV_DVB_SD")},
    {11, named("DTV_ATSC_HD")},
    {12, named("DTV_ATSC_HD")},
    {18, named("HDV_HD1")},
    {19, named("HDV_HD2")},
    {26, named("BD_MPEG")},
    {27, named("BD_MPEG_HDMV")},
    {38, named("XDCAM_HD_420_1280")},
    {39, named("XDCAM_HD_422_1920")},
    {40, named("XDCAM_HD_422_1280")},
    {41, named("XDCAM_EX_1920")},
    {42, named("XDCAM_EX_1440")},
    {43, named("XDCAM_EX_1280")},
};
// Type 2 is MPEG-2 of whatever kind; the old number says which.
constexpr int kPlainMpeg2 = 2;
constexpr Row mpeg2Numbers[] = {
    {second(0x12), named("MPEG2_HIGH")},
    {second(0x13), named("MPEG2_HIGH_1440")},
    {second(0x0A), named("MPEG2_MAIN")},
};

int find(std::span<const Row> table, int from, int otherwise = QvProfile::notSet) {
    for (const Row& row : table)
        if (row.from == from) return row.profile;
    return otherwise;
}

int findByNumber(int number) {
    // A preset of which nothing is known is likely to be H.264.
    constexpr int catchAll = named("H264_MAIN");
    const bool inScheme = number >= second(1) && number <= second(0x6F);
    return inScheme ? find(byNumber, number - second(0), catchAll) : catchAll;
}

bool isDv(std::string_view codec, std::string_view muxer) {
    return codec == "dvvenc" || codec == "dv100venc" || muxer == "dvavimux" || muxer == "dv100mux" ||
           muxer == "dvmux";
}

int findDv(std::string_view muxer, const Any* settings) {
    if (!settings || !settings->isGeneric()) return QvProfile::notSet;
    const bool whole = settings->size() == 0 || settings->size() >= static_cast<int>(sizeof(QvDvSettings));
    const auto* record = static_cast<const QvDvSettings*>(settings->asGeneric());
    if (!record || !whole) return QvProfile::notSet;
    return muxer == "dvavimux" ? find(dvAvi, record->kind) : find(dv, record->kind);
}

}  // namespace

int qvProfile2No(int oldNumber, int type, const char* videoCodec, const char* muxer, const Any* settings) {
    const int number = qvFixOldProfileNo(oldNumber);
    const std::string_view codec = videoCodec ? videoCodec : "", container = muxer ? muxer : "";
    if (codec.empty()) return findByNumber(number);
    if (codec == "mj2kvenc") return find(jpeg2000, type);
    if (isDv(codec, container)) return findDv(container, settings);
    if (codec == "rawvenc") return QvProfile::raw;
    if (codec == "stdvc1venc" || codec == "vc1venc") return find(vc1, type);
    if (codec == "mpeg4venc") return find(mpeg4Numbers, number, find(mpeg4, type));
    if (codec == "h264venc" || codec == "stdh264venc") return find(h264Numbers, number, find(h264, type));
    if (codec == "mpegvenc") return type == kPlainMpeg2 ? find(mpeg2Numbers, number) : find(mpeg, type);
    return QvProfile::notSet;
}
