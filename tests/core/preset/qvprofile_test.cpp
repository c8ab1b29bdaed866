#include "core/preset/qvprofile.h"

#include "core/engine/qvutil.h"
#include "tests/support/checks.h"

namespace {

TEST(Profile, SymbolsOfTheCurrentSchemeComeFirst) {
    EXPECT_EQ(qvSymToProfile("H264_QT"), 0x2160011);
    EXPECT_EQ(qvSymToProfile("RAW"), 0x216000F);
    EXPECT_EQ(qvSymToProfile("MPEG_1"), 0x1000001);
    EXPECT_EQ(qvSymToProfile("SILVERLIGHT_H264"), 0x2151002);
    for (const char* unknown : {"", "raw", "MPEG_99"}) EXPECT_EQ(qvSymToProfile(unknown), -1);
    EXPECT_EQ(qvSymToProfile(nullptr), -1);
    EXPECT_STREQ(qvProfileToSym(0x2010006), "PSP_MPEG4_320x240");
    EXPECT_STREQ(qvProfileToSym(0x1000027), "H264_QT");
    for (const int unknown : {-1, 13, 0x2000000, 0x2800000}) EXPECT_STREQ(qvProfileToSym(unknown), "");
}

TEST(Profile, NumbersOfTheOldestSchemeAreLifted) {
    const Pair cases[] = {{0, 0x1000064},    {10, 0x100000D},        {13, 0x100001E},
                          {27, 0x100003E},   {28, 0x1000064},        {0xFFFFFF, 0x1000064},
                          {-1, 0x1000064},   {0x1000000, 0x1000000}, {0x2000000, 0x2000000},
                          {INT_MAX, INT_MAX}};
    for (const Pair& c : cases) EXPECT_EQ(qvFixOldProfileNo(c.first), c.second) << c.first;
}

TEST(Profile, XdcamExIsKnownInBothSchemes) {
    for (const int profile : {0x1000016, 0x20E0000, 0x20E0001})
        EXPECT_TRUE(QvUtil::isExProfile(profile)) << profile;
    for (const int profile : {-1, 0, 0x1000015, 0x20D0001, 0x20F0000, 0x41C0000})
        EXPECT_FALSE(QvUtil::isExProfile(profile)) << profile;
}

TEST(Profile, OldDescriptionsGetACurrentNumber) {
    const struct {
        int number, type;
        const char *codec, *profile;
    } cases[] = {
        // Without an encoder the number decides.
        {0x1000063, 0, nullptr, "H264_MAIN"},
        {0x1000070, 0, nullptr, "H264_MAIN"},
        {0x1000000, 0, nullptr, "H264_MAIN"},
        {0x2160001, 0, nullptr, "H264_MAIN"},
        {0x100006F, 0, nullptr, "AVCINTRA_50"},
        {0x1000037, 0, nullptr, "DVCPRO100_720p_NATIVE"},
        {8, 0, "", "DVD"},
        {28, 0, nullptr, "H264_MAIN"},
        // With one its type does.
        {0, 28929, "mj2kvenc", "DCI_4K"},
        {0, 28930, "mj2kvenc", ""},
        {0, 0, "rawvenc", "RAW"},
        {0, 9, "stdvc1venc", "BD_VC1_HDMV"},
        {0, 1, "vc1venc", ""},
        {0x100004C, 11, "mpeg4venc", "3GP_MPEG4"},
        {0x1000048, 99, "mpeg4venc", "3GP_H263"},
        {0, 18, "mpeg4venc", "MPEG4_HD"},
        {0, 18, "h264venc", "AVCINTRA_50"},
        {0x1000024, 8, "h264venc", "3GP_H264"},
        {0x1000026, 8, "stdh264venc", "H264_MAIN"},
        {0x1000027, 8, "stdh264venc", "BD_H264"},
        {0, 3, "h264venc", ""},
        {0, 32, "mpegvenc", ""},
        {0x1000012, 43, "mpegvenc", "XDCAM_EX_1280"},
        {0x1000012, 2, "mpegvenc", "MPEG2_HIGH"},
        {7, 2, "mpegvenc", "MPEG2_HIGH_1440"},
        {0x1000001, 2, "mpegvenc", ""},
        {0x100001E, 5, "bch264venc", ""},
    };
    for (const auto& c : cases) {
        const int profile = qvProfile2No(c.number, c.type, c.codec, "mp4mux", nullptr);
        EXPECT_EQ(profile, qvSymToProfile(c.profile)) << (c.codec ? c.codec : "-") << " " << c.type;
    }
}

TEST(Profile, DvSettingsSayWhichDv) {
    QvDvSettings settings;
    const Any record(&settings, 0);
    const auto find = [&](int kind, const char* codec, const char* muxer, const Any* given) {
        settings.kind = kind;
        return std::string(qvProfileToSym(qvProfile2No(0, 0, codec, muxer, given)));
    };
    EXPECT_EQ(find(5, "dvvenc", "dvavimux", &record), "DVAVI_DVCPRO100_1080i");
    EXPECT_EQ(find(1, "dv100venc", nullptr, &record), "DV");
    EXPECT_EQ(find(4, "other", "dv100mux", &record), "DVCPRO100_720p");
    for (const int kind : {0, 6, -1}) EXPECT_EQ(find(kind, "dvvenc", "dvmux", &record), "");
    const Any none, number(3), text("1"), half("\1", 1), empty(static_cast<const void*>(nullptr), 0);
    for (const Any* unfit : {&none, &number, &text, &half, &empty, static_cast<const Any*>(nullptr)})
        EXPECT_EQ(find(1, "dvvenc", "dvmux", unfit), "");
    const Any tooShort(static_cast<const void*>("\1"), 1);
    EXPECT_EQ(find(1, "dvvenc", "dvmux", &tooShort), "");
}

}  // namespace
