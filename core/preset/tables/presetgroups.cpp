#include "core/preset/tables/presetgroups_p.h"

#include "core/preset/tables/profilesymbols_p.h"

namespace {

using profileScheme::named;

// clang-format off
constexpr PresetGroupRow groups[] = {
    {101, "Custom", 0, {named("H264_BASELINE"), named("H264_MAIN"), named("H264_HIGH"), named("SVC"), named("GPU"),
                        named("H264_QT"), named("VC1_BASELINE"), named("VC1_MAIN"), named("VC1_HIGH"),
                        named("MPEG4_SD"), named("MPEG4_HD"), named("MPEG1"), named("MPEG2_SIMPLE"),
                        named("MPEG2_MAIN"), named("MPEG2_HIGH"), named("MPEG2_HIGH_1440"), named("MPEG2_422"),
                        named("MVC_BD_3D"), named("VC3_GENERIC")}},
    {102, "PSP",                    0x0201, {}},
    {103, "Apple",                  0x0202, {}},
    {104, "3GP",                    0,      {named("3GP_H263"), named("3GP_MPEG4"), named("3GP_H264")}},
    {105, "Flash",                  0,      {named("FLASH_HIGH"), named("FLASH_LOW")}},
    {125, "Silverlight",            0,      {named("SILVERLIGHT_H264"), named("SILVERLIGHT_VC1")}},
    {106, "Blu-Ray",                0x0203, {}},
    {107, "DVD",                    0,      {named("DVD")}},
    {109, "SVCD",                   0,      {named("SVCD")}},
    {108, "VCD",                    0,      {named("VCD")}},
    {110, "DV",                     0x0206, {}},
    {111, "DV AVI",                 0x0209, {}},
    {112, "DVCAM",                  0,      {named("DVCAM")}},
    {113, "XDCAM IMX",              0x020D, {}},
    {114, "XDCAM EX",               0x020E, {}},
    {115, "XDCAM HD",               0x020F, {}},
    {116, "Panasonic P2 DVCPRO",    0x0208, {}},
    {117, "Panasonic P2 AVC-Intra", 0,      {named("AVCINTRA_100"), named("AVCINTRA_50")}},
    {118, "AVCHD",                  0,      {named("AVCHD")}},
    {119, "JPEG2000",               0x020A, {}},
    {120, "DivX",                   0,      {named("DIVX6_1080"), named("DIVX6_HDTV"), named("DIVX6_HOME_THEATER"),
                                             named("DIVX6_MOBILE"), named("DIVX6_QMOBILE")}},
    {121, "DivX Plus",              0,      {named("DIVX7_HD_PLUS"), named("DIVX7_DPS_SD"), named("DIVX7_DPS_HD")}},
    {122, "Digital TV",             0,      {named("DTV_DVB_SD"), named("DTV_DVB_HD"), named("DTV_ATSC_HD"),
                                             named("DTV_ATSC_SD")}},
    {123, "HDV",                    0,      {named("HDV_HD2"), named("HDV_HD1")}},
    {124, "Uncompressed",           0,      {named("RAW"), named("AVI_RAW")}},
};
// clang-format on

}  // namespace

std::vector<int> PresetGroupRow::members() const {
    std::vector<int> all;
    for (const ProfileSymbol& row : profileScheme::currentSymbols)
        if (family && profileScheme::familyOf(row.number) == family) all.push_back(row.number);
    for (const int profile : profiles)
        if (profile) all.push_back(profile);
    return all;
}

std::span<const PresetGroupRow> qvPresetGroups() { return groups; }
