// Whole conversions by their call.
#include "core/filter/srscaler.h"

#include <gtest/gtest.h>

#include <climits>
#include <cmath>
#include <cstring>
#include <string>
#include <vector>

#include "builtin/kernels/formats/paths.h"
#include "tests/builtin/kernels/layouts.h"
#include "tests/support/guarded.h"
#include "tests/support/vector_targets.h"

namespace {

// All formats by names that a caller uses; one depth of each W family, and others besides.
std::vector<std::string> formatNames() {
    std::vector<std::string> names;
    for (const auto& format : srk::formats()) {
        std::string name = format.name;
        if (const auto at = name.find("XX"); at != std::string::npos) name.replace(at, 2, "12");
        names.push_back(name);
    }
    return names;
}

void convert(const std::string& from, const void* source, int w, int h, const std::string& to, void* target,
             int tw, int th, unsigned flags = 0, unsigned mode = 0, const int* rectangles = nullptr) {
    ASSERT_EQ(
        SRScaler(mode, codeOf(from), source, 0, w, h, codeOf(to), target, 0, tw, th, 0, flags, rectangles), 1)
        << from << ' ' << w << 'x' << h << " to " << to;
}

using Bytes = std::vector<unsigned char>;

Bytes ramp(int w, int h, double dx, double dy, double base) {
    Bytes bytes(static_cast<size_t>(w * h));
    // GRAY has lines of whole double words; these tests use such widths.
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x)
            bytes[static_cast<size_t>(y * w + x)] =
                static_cast<unsigned char>(std::lround(std::clamp(base + dx * x + dy * y, 0.0, 255.0)));
    return bytes;
}

constexpr unsigned kinds[] = {QvScale::nearest, QvScale::high, QvScale::standard};

}  // namespace

TEST(Conversion, EveryPairKeepsAColour) {
    constexpr int w = 24, h = 8;
    constexpr unsigned char colours[][3] = {
        {0, 0, 0}, {255, 255, 255}, {24, 130, 222}, {0, 0, 255}, {128, 128, 128}};
    const auto names = formatNames();
    for (const auto& colour : colours)
        for (const auto& first : names)
            for (const auto& second : names) {
                Bytes rgb(static_cast<size_t>(w * h * 3));
                for (size_t i = 0; i < rgb.size(); ++i) rgb[i] = colour[i % 3];
                Guarded a(bytesOf(first, w, h)), b(bytesOf(second, w, h));
                Bytes back(rgb.size());
                convert("BGR3", rgb.data(), w, h, first, a.data(), w, h);
                convert(first, a.data(), w, h, second, b.data(), w, h);
                convert(second, b.data(), w, h, "BGR3", back.data(), w, h);
                const bool grey = first == "GRAY" || second == "GRAY" || first == "Y16" || second == "Y16";
                const bool coarse = first[1] == '5' || second[1] == '5';
                const double luma = 0.114 * colour[0] + 0.587 * colour[1] + 0.299 * colour[2];
                for (size_t i = 0; i < back.size(); ++i) {
                    const double expected = grey ? luma : colour[i % 3];
                    ASSERT_NEAR(back[i], expected, coarse ? 8 : 3)
                        << first << " to " << second << " at " << i;
                }
            }
}

TEST(Conversion, RgbNeverMeetsYuvWithoutNeed) {
    for (int s = 0; s < srk::formatCount; ++s)
        for (int t = 0; t < srk::formatCount; ++t)
            for (const auto use : {srk::Use::plain, srk::Use::scaling}) {
                const auto& path = srk::pathOf(s, t, use);
                ASSERT_TRUE(path);
                const bool rgb = srk::formats()[static_cast<size_t>(s)].has(srk::isRgb) &&
                                 srk::formats()[static_cast<size_t>(t)].has(srk::isRgb);
                if (rgb) {
                    EXPECT_TRUE(path.from != srk::Core::yuv8 && path.from != srk::Core::yuv16 &&
                                path.cost < 256);
                }
            }
    // A shuffle, and planes in place.
    EXPECT_EQ(srk::pathOf(1, 2, srk::Use::plain).from, srk::Core::packed8);
    EXPECT_EQ(srk::pathOf(1, 2, srk::Use::plain).cost, 1);
    EXPECT_EQ(srk::pathOf(17, 17, srk::Use::plain).cost, 0);
    EXPECT_EQ(srk::pathOf(17, 20, srk::Use::plain).cost, 0);
}

TEST(Conversion, NothingOutsideOfThePicturesIsTouched) {
    for (const auto& name : formatNames())
        for (const int w : {1, 2, 3, 5, 7, 17, 66})
            for (const int h : {1, 2, 3, 9})
                for (const unsigned flags :
                     {QvScale::nearest, QvScale::standard | QvScale::interlaced, QvScale::high}) {
                    Guarded from(bytesOf("I420", w, h), 3), middle(bytesOf(name, w, h), 4),
                        to(bytesOf("YUYV", w + 3, h + 1), 5);
                    convert("I420", from.data(), w, h, name, middle.data(), w, h, flags);
                    convert(name, middle.data(), w, h, "YUYV", to.data(), w + 3, h + 1, flags);
                    ASSERT_TRUE(from.intact() && middle.intact() && to.intact())
                        << name << ' ' << w << 'x' << h;
                }
}

namespace {

// A picture in its own memory, whose lines follow each other downwards or upwards.
struct Held {
    Bytes memory;
    srk::Picture layout;

    Held(const std::string& name, int w, int h, bool upwards)
        : memory(bytesOf(name, w, h), 7), layout(layoutOf(codeOf(name), w, h, memory.data())) {
        walkUpwards(layout, upwards ? 7 : 0);
    }
    // The bytes of all lines from the top.
    template <class Each>
    void eachByte(const Each& each) {
        for (int p = 0; p < layout.format->planes(); ++p)
            for (int y = 0; y < layout.planeHeight(p); ++y)
                for (long long x = 0; x < srk::lineBytes(*layout.format, layout.width, p); ++x)
                    each(layout.planes[p].data[layout.planes[p].stride * y + x]);
    }
};

}  // namespace

TEST(Conversion, EveryPairIsTheSameOnEveryUnitAndHoweverThePlanesLie) {
    const auto names = formatNames();
    unsigned turn = 0;
    for (const auto& from : names)
        for (const auto& to : names)
            for (const unsigned flags : {QvScale::nearest, QvScale::standard | QvScale::target709,
                                         QvScale::high | QvScale::interlaced}) {
                const int w = 1 + static_cast<int>(++turn * 7 % 75), h = 1 + static_cast<int>(turn % 6);
                const int tw = turn % 3 ? w : 1 + static_cast<int>(turn * 11 % 90);
                Bytes expected;
                // In one block as it is by itself, and by its planes, downwards and upwards.
                for (const int way : {0, 1, 2})
                    for (const auto target : machineTargets()) {
                        Held source(from, w, h, way == 2), made(to, tw, h, way == 2);
                        unsigned value = turn;
                        source.eachByte([&](unsigned char& byte) {
                            byte = static_cast<unsigned char>((value = value * 1664525u + 1013904223u) >> 24);
                        });
                        const OnTarget only(target);
                        const auto a = recordOf(codeOf(from), source.layout);
                        auto b = recordOf(codeOf(to), made.layout);
                        if (way == 0)
                            convert(from, source.memory.data(), w, h, to, made.memory.data(), tw, h, flags,
                                    QvScale::oneThread);
                        else
                            ASSERT_EQ(SRScaler(QvScale::oneThread, a.tag, &a, 0, 0, 0, b.tag, &b, 0, 0, 0, 0,
                                               flags, nullptr),
                                      1);
                        Bytes bytes;
                        made.eachByte([&](unsigned char byte) { bytes.push_back(byte); });
                        if (expected.empty()) expected = bytes;
                        ASSERT_EQ(bytes, expected)
                            << from << " to " << to << ' ' << w << 'x' << h << " to " << tw << " flags "
                            << flags << " way " << way << " on " << hwy::TargetName(target);
                    }
            }
}

TEST(Conversion, TenBitsComeBackAsTheyWere) {
    constexpr int w = 50, h = 4;
    Guarded words(bytesOf("Y210", w, h), 8);
    for (size_t i = 0; i < words.size(); i += 2) words.data()[i] &= 0xC0;
    for (const char* name : {"v210", "P210", "W210", "Y216", "v216", "P216", "W216"}) {
        Guarded middle(bytesOf(name, w, h)), back(bytesOf("Y210", w, h));
        convert("Y210", words.data(), w, h, name, middle.data(), w, h);
        convert(name, middle.data(), w, h, "Y210", back.data(), w, h);
        EXPECT_EQ(std::memcmp(words.data(), back.data(), words.size()), 0) << name;
    }
}

TEST(Conversion, MatricesChangeOnlyBetweenDifferentOnes) {
    constexpr int w = 8, h = 4;
    Bytes blue(w * h * 3, 0), yuv(w * h * 4), other(w * h * 4), back(w * h * 3);
    for (size_t i = 0; i < blue.size(); i += 3) blue[i] = 255;
    convert("BGR3", blue.data(), w, h, "VUY4", yuv.data(), w, h, QvScale::target601);
    EXPECT_EQ(yuv[2], 41);
    EXPECT_EQ(yuv[1], 240);
    for (const char* name : {"I444", "I420", "YUYV", "v210", "W016"}) {
        Bytes middle(bytesOf(name, w, h));
        convert("VUY4", yuv.data(), w, h, name, middle.data(), w, h, QvScale::source601 | QvScale::target709);
        convert(name, middle.data(), w, h, "VUY4", other.data(), w, h,
                QvScale::source709 | QvScale::target709);
        EXPECT_NEAR(other[2], 32, 1) << name;
        convert("VUY4", other.data(), w, h, "BGR3", back.data(), w, h, QvScale::source709);
        EXPECT_NEAR(back[0], 255, 3);
        EXPECT_NEAR(back[2], 0, 3);
    }
    convert("BGR3", blue.data(), w, h, "HDYC", other.data(), w, h, QvScale::target601);
    EXPECT_EQ(other[1], 32);
}

TEST(Scaling, FlatStaysFlatAtAnySize) {
    for (const unsigned kind : kinds)
        for (const auto& [w, h, tw, th] : {std::array{40, 30, 64, 7},
                                           {4, 4, 333, 100},
                                           {640, 480, 5, 4},
                                           {12, 12, 13, 11},
                                           {33, 17, 1, 1}})
            for (const unsigned field : {0u, QvScale::interlaced}) {
                for (const char* name : {"I420", "BGR4", "W016", "YVU9"}) {
                    if (name[0] == 'W' && tw % 2) continue;  // lines with a byte to spare
                    Bytes from(bytesOf(name, w, h), 99), to(bytesOf(name, tw, th), 7);
                    convert(name, from.data(), w, h, name, to.data(), tw, th, kind | field);
                    for (size_t i = 0; i < to.size(); ++i) {
                        if (std::string(name) == "BGR4" && i % 4 == 3) continue;
                        ASSERT_EQ(to[i], 99)
                            << name << ' ' << w << 'x' << h << " to " << tw << 'x' << th << " kind " << kind;
                    }
                }
            }
}

TEST(Scaling, RampsStayInPlaceAtAnyRatio) {
    constexpr int w = 128, h = 64;
    for (const int tw : {16, 44, 64, 84, 124, 128, 132, 192, 256, 380})
        for (const int th : {16, 40, 64, 100})
            for (const unsigned kind : {QvScale::high, QvScale::standard})
                for (const unsigned field : {0u, QvScale::interlaced}) {
                    const Bytes from = ramp(w, h, 1.5, 0.5, 20);
                    Bytes to(static_cast<size_t>(tw * th));
                    convert("GRAY", from.data(), w, h, "GRAY", to.data(), tw, th, kind | field);
                    for (int y = th / 4; y < th * 3 / 4; ++y)
                        for (int x = tw / 6; x < tw * 5 / 6; ++x) {
                            const double sx = (x + 0.5) * w / tw - 0.5, sy = (y + 0.5) * h / th - 0.5;
                            ASSERT_NEAR(to[static_cast<size_t>(y * tw + x)], 20 + 1.5 * sx + 0.5 * sy, 1.3)
                                << tw << 'x' << th << " kind " << (kind | field) << " at " << x << ',' << y;
                        }
                    for (int y = 0; y < th; ++y)
                        for (int x = 1; x < tw; ++x)
                            ASSERT_GE(to[static_cast<size_t>(y * tw + x)] + (kind == QvScale::high),
                                      to[static_cast<size_t>(y * tw + x - 1)]);
                }
}

TEST(Scaling, ChromaFollowsLumaInEachFormatAndField) {
    constexpr int w = 64, h = 32;
    Bytes yuv(w * h * 4);
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x) {
            unsigned char* pixel = yuv.data() + (y * w + x) * 4;
            const auto value = static_cast<unsigned char>(30 + 2 * x + y);
            pixel[0] = pixel[1] = pixel[2] = value;
        }
    for (const char* name : {"I444", "YUYV", "I420", "YV12", "v210", "W016", "P216"})
        for (const unsigned field : {0u, QvScale::interlaced})
            for (const unsigned kind : {QvScale::high, QvScale::standard}) {
                Bytes middle(bytesOf(name, w, h)), back(yuv.size());
                convert("VUY4", yuv.data(), w, h, name, middle.data(), w, h, kind | field);
                convert(name, middle.data(), w, h, "VUY4", back.data(), w, h, kind | field);
                for (int y = 8; y < h - 8; ++y)
                    for (int x = 8; x < w - 8; ++x)
                        for (int p = 0; p < 3; ++p)
                            ASSERT_NEAR(back[static_cast<size_t>((y * w + x) * 4 + p)],
                                        yuv[static_cast<size_t>((y * w + x) * 4 + p)], 1.1)
                                << name << " field " << field << " kind " << kind << " at " << x << ',' << y
                                << " plane " << p;
            }
}

// Against the geometry itself: a round trip would not notice fields that are exchanged.
//
//     lines of the top field     0 . 2 . 4 . 6      chroma a quarter of the way from 0 to 2, from 4 to 6
//     lines of the bottom field  . 1 . 3 . 5 . 7    chroma three quarters of the way from 1 to 3, from 5 to 7
TEST(Scaling, ChromaOfEachFieldLiesWhereItsLinesAsk) {
    constexpr int w = 16, h = 48, slope = 4;
    Bytes yuv(w * h * 4), planar(bytesOf("I420", w, h)), back(yuv.size());
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < 4 * w; ++x)
            yuv[static_cast<size_t>(y * w * 4 + x)] = static_cast<unsigned char>(20 + slope * y);
    for (const unsigned kind : {QvScale::high, QvScale::standard}) {
        convert("VUY4", yuv.data(), w, h, "I420", planar.data(), w, h, kind | QvScale::interlaced);
        const auto chroma = [&](int line) -> unsigned char& {
            return planar[static_cast<size_t>(w * h + line * w / 2)];
        };
        for (int line = 4; line < h / 2 - 4; ++line) {
            const int field = line % 2;
            const double at = field + 2 * (line / 2 * 2 + (field ? 0.75 : 0.25));
            EXPECT_NEAR(chroma(line), 20 + slope * at, 1) << "line " << line << " kind " << kind;
        }
        // And the way back, from chroma that is laid where it belongs.
        for (int line = 0; line < h / 2; ++line) {
            const double at = line % 2 + 2 * (line / 2 * 2 + (line % 2 ? 0.75 : 0.25));
            std::memset(&chroma(line), static_cast<int>(std::lround(20 + slope * at)), w / 2);
        }
        convert("I420", planar.data(), w, h, "VUY4", back.data(), w, h, kind | QvScale::interlaced);
        for (int y = 8; y < h - 8; ++y)
            EXPECT_NEAR(back[static_cast<size_t>(y * w * 4 + 1)], 20 + slope * y, 1)
                << "line " << y << " kind " << kind;
    }
}

TEST(Scaling, BandsOnSeveralThreadsAreOnePicture) {
    constexpr int w = 200, h = 150, tw = 132, th = 203;
    for (const char* name : {"I420", "BGR4", "v210"})
        for (const unsigned flags :
             {QvScale::standard, QvScale::high | QvScale::interlaced, QvScale::nearest}) {
            Guarded from(bytesOf(name, w, h), 6);
            Bytes one(bytesOf("YV12", tw, th), 1), many(bytesOf("YV12", tw, th), 2);
            convert(name, from.data(), w, h, "YV12", one.data(), tw, th, flags, QvScale::oneThread);
            convert(name, from.data(), w, h, "YV12", many.data(), tw, th, flags);
            EXPECT_EQ(one, many) << name;
        }
}

TEST(Scaling, RectanglesPlaceCropAndMirror) {
    constexpr int w = 16, h = 8;
    const Bytes from = ramp(w, h, 10, 1, 5);
    Bytes to(w * h, 200);
    auto* source = from.data();
    const int place[8] = {4 * 256, 2 * 256, 7 * 256, 3 * 256, 8, 4, 11, 5};
    convert("GRAY", source, w, h, "GRAY", to.data(), w, h, 2, QvScale::cropSource | QvScale::placeTarget,
            place);
    for (int y = 0; y < h; ++y)
        for (int x = 0; x < w; ++x) {
            const bool inside = x >= 8 && x <= 11 && y >= 4 && y <= 5;
            ASSERT_EQ(to[static_cast<size_t>(y * w + x)],
                      inside ? from[static_cast<size_t>((y - 2) * w + x - 4)] : 200);
        }
    const int mirror[8] = {(w - 1) * 256, 0, 0, (h - 1) * 256, 0, 0, 0, 0};
    convert("GRAY", source, w, h, "GRAY", to.data(), w, h, 2, QvScale::cropSource, mirror);
    for (int x = 0; x < w; ++x) EXPECT_EQ(to[static_cast<size_t>(x)], from[static_cast<size_t>(w - 1 - x)]);
    // No scaling: what both have.
    Bytes small(12 * 4, 1);
    convert("GRAY", source, w, h, "GRAY", small.data(), 12, 4, QvScale::clip | QvScale::standard);
    for (int y = 0; y < 4; ++y) EXPECT_EQ(std::memcmp(small.data() + y * 12, from.data() + y * w, 12), 0);
}

TEST(Scaling, ABlockMayBeWrittenUpwards) {
    constexpr int w = 20, h = 10;
    Guarded from(bytesOf("I420", w, h), 2);
    Bytes whole(bytesOf("BGR4", w, h)), upward(whole.size());
    convert("I420", from.data(), w, h, "BGR4", whole.data(), w, h, 2);
    ASSERT_EQ(SRScaler(0, codeOf("I420"), from.data(), 0, w, h, codeOf("BGR4"),
                       upward.data() + (h - 1) * w * 4, -w * 4, w, h, 0, 2, nullptr),
              1);
    for (int line = 0; line < h; ++line)
        EXPECT_EQ(std::memcmp(whole.data() + line * w * 4, upward.data() + (h - 1 - line) * w * 4, w * 4), 0);
}

TEST(Scaling, WhatCanNotBeDoneLeavesTheTargetAlone) {
    Bytes from(4096, 1), to(4096, 2);
    const unsigned bgr4 = qvFourcc("BGR4"), i420 = qvFourcc("I420"), ext = qvFourcc("EXT1");
    const QvScalePicture untagged = {0, i420, 8, 8, 0, 0, 0, {from.data(), from.data(), from.data()}};
    const QvScalePicture planeless = {ext, i420, 8, 8, 0, 0, 0, {from.data(), nullptr, from.data()}};
    const int beyond[8] = {0, 0, 255, 255, 9, 0, 12, 7}, before[8] = {0, 0, 255, 255, -1, 0, 7, 7};
    const int empty[8] = {0, 0, 255, 255, 4, 4, 3, 7},
              least[8] = {0, 0, 0, 0, INT_MIN, INT_MIN, INT_MAX, INT_MAX};
    struct {
        unsigned mode, source;
        const void* data;
        int stride, w, h;
        unsigned target;
        void* out;
        int outStride, tw, th;
        const int* rectangles;
    } const rows[] = {
        {0, qvFourcc("W017"), from.data(), 0, 8, 8, bgr4, to.data(), 0, 8, 8, nullptr},
        {0, bgr4, from.data(), 0, 8, 8, qvFourcc("W008"), to.data(), 0, 8, 8, nullptr},
        {0, 0, from.data(), 0, 8, 8, bgr4, to.data(), 0, 8, 8, nullptr},
        {0, bgr4, nullptr, 0, 8, 8, bgr4, to.data(), 0, 8, 8, nullptr},
        {0, bgr4, from.data(), 0, 8, 8, bgr4, nullptr, 0, 8, 8, nullptr},
        {0, bgr4, from.data(), 0, 0, 8, bgr4, to.data(), 0, 8, 8, nullptr},
        {0, bgr4, from.data(), 0, 8, -8, bgr4, to.data(), 0, 8, 8, nullptr},
        {0, bgr4, from.data(), 0, 8, 8, bgr4, to.data(), 0, 8, 0, nullptr},
        {0, bgr4, from.data(), 31, 8, 8, bgr4, to.data(), 0, 8, 8, nullptr},
        {0, bgr4, from.data(), 0, 8, 8, bgr4, to.data(), -31, 8, 8, nullptr},
        {0, i420, from.data(), -8, 8, 8, bgr4, to.data(), 0, 8, 8, nullptr},
        {0, ext, &untagged, 0, 8, 8, bgr4, to.data(), 0, 8, 8, nullptr},
        {0, ext, &planeless, 0, 8, 8, bgr4, to.data(), 0, 8, 8, nullptr},
        {QvScale::placeTarget, bgr4, from.data(), 0, 8, 8, bgr4, to.data(), 0, 8, 8, beyond},
        {QvScale::placeTarget, bgr4, from.data(), 0, 8, 8, bgr4, to.data(), 0, 8, 8, before},
        {QvScale::placeTarget, bgr4, from.data(), 0, 8, 8, bgr4, to.data(), 0, 8, 8, empty},
        {QvScale::placeTarget, bgr4, from.data(), 0, 8, 8, bgr4, to.data(), 0, 8, 8, least},
    };
    for (const auto& r : rows)
        EXPECT_EQ(SRScaler(r.mode, r.source, r.data, r.stride, r.w, r.h, r.target, r.out, r.outStride, r.tw,
                           r.th, 0, 2, r.rectangles),
                  0)
            << &r - rows;
    EXPECT_EQ(to, Bytes(4096, 2));
    // Source rectangles of any numbers: what lies outside repeats the edge.
    for (const int a : {INT_MIN, -70000, 0, 300, INT_MAX})
        for (const int b : {INT_MIN, -1, 5, INT_MAX}) {
            const int hostile[8] = {a, b, b, a, 0, 0, 0, 0};
            EXPECT_EQ(SRScaler(QvScale::cropSource, bgr4, from.data(), 0, 8, 8, bgr4, to.data(), 0, 8, 8, 0,
                               2, hostile),
                      1);
            EXPECT_EQ(to[0], 1);
        }
}

TEST(Scaling, LongestLines) {
    constexpr int longest = 65535;
    Guarded from(bytesOf("BGR3", longest, 2), 1), to(bytesOf("I420", 5, 4)),
        wide(bytesOf("UYVY", longest, 3));
    convert("BGR3", from.data(), longest, 2, "I420", to.data(), 5, 4, 2);
    convert("I420", to.data(), 5, 4, "UYVY", wide.data(), longest, 3, 1);
    EXPECT_TRUE(to.intact() && wide.intact());
}
