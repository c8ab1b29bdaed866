#include "core/media/qvdraw.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <climits>
#include <cmath>
#include <cstring>
#include <set>
#include <string>

#include "core/engine/qvexception.h"
#include "core/media/rect.h"
#include "core/value/any.h"
#include "tests/core/media/frame_model.h"

namespace {

using namespace QvFourcc;
using Pixels = std::set<std::pair<int, int>>;

void makeBlack(QvFrame& frame, unsigned fourcc, int width, int height) {
    frame.init(fourcc, width, height);
    frame.setBlack();
}

// Places whose pixel is not black; the picture's pixels have 3 or 4 bytes.
Pixels drawn(const QvFrame& frame) {
    Pixels found;
    const int bytes = frame.pixelBytes();
    for (int y = 0; y < frame.height(); ++y)
        for (int x = 0; x < frame.width(); ++x)
            if (std::any_of(frame.pixelPtr(x, y), frame.pixelPtr(x, y) + bytes, [](int b) { return b != 0; }))
                found.insert({x, y});
    return found;
}

TEST(QvColor, ConvertsBothWays) {
    struct Case {
        QvColor in;
        bool hd;
        QvColor out;
    };
    const Case toYuv[] = {
        {QvColor(0x000000), false, {0, 128, 128, true}}, {QvColor(0xffffff), false, {255, 128, 128, true}},
        {QvColor(0xff0000), false, {76, 86, 255, true}}, {QvColor(0x00ff00), true, {183, 31, 13, true}},
        {QvColor(0x0000ff), true, {18, 255, 117, true}}, {QvColor(0x102030), false, {29, 139, 120, true}},
        {{1, 2, 3, true}, true, {1, 2, 3, true}},
    };
    for (const auto& c : toYuv) {
        const QvColor got = c.in.yuv(c.hd);
        EXPECT_TRUE(got.c0 == c.out.c0 && got.c1 == c.out.c1 && got.c2 == c.out.c2 && got.isYuv)
            << int(got.c0) << " " << int(got.c1) << " " << int(got.c2) << " for " << std::hex
            << c.in.bgr32(false);
    }
    // White is the largest sum, and stays white.
    EXPECT_EQ(QvColor(0xffffff).yuv(true).c0, 255);

    struct Back {
        QvColor in;
        bool hd;
        unsigned rgb;
    };
    const Back toRgb[] = {
        {{128, 128, 128, true}, false, 0x808080}, {{76, 85, 255, true}, false, 0xfe0000},
        {{0, 0, 0, true}, false, 0x008700},       {{255, 255, 255, true}, true, 0xffacff},
        {QvColor(0x123456), true, 0x123456},
    };
    for (const auto& c : toRgb) EXPECT_EQ(c.in.bgr32(c.hd), c.rgb) << std::hex << c.in.bgr32(c.hd);
    unsigned char r = 0, g = 0, b = 0;
    QvColor::yuv2rgb(255, 128, 0, &r, &g, &b, false, true);
    EXPECT_TRUE(r == 75 && g == 235 && b == 235);

    const QvColor plain(0x102030);
    EXPECT_TRUE(plain.c0 == 0x10 && plain.c1 == 0x20 && plain.c2 == 0x30 && !plain.isYuv);
}

TEST(QvColor, ConversionsFollowTheirTables) {
    const auto cut = [](int value) { return std::clamp(value, 0, 255); };
    for (int a = 0; a < 256; a += 5)
        for (int b = 0; b < 256; b += 15)
            for (int c = 0; c < 256; c += 15)
                for (bool hd : {false, true}) {
                    const auto byte = [](int value) { return static_cast<unsigned char>(value); };
                    const QvColor yuv = QvColor(byte(a), byte(b), byte(c), false).yuv(hd);
                    const int y = hd ? 227 * a + 733 * b + 74 * c : 306 * a + 601 * b + 117 * c;
                    const int u = hd ? 512 * (c + 1) - 117 * a - 395 * b : 512 * (c + 1) - 173 * a - 339 * b;
                    const int v = hd ? 514 * a - 467 * b - 47 * c + 512 : 512 * (a + 1) - 429 * b - 83 * c;
                    ASSERT_EQ(yuv.c0, cut((y + 512) / 1024));
                    ASSERT_EQ(yuv.c1, cut(u / 1024 + 128));
                    ASSERT_EQ(yuv.c2, cut(v / 1024 + 128));
                    const QvColor rgb = QvColor(byte(a), byte(b), byte(c), true).rgb(hd);
                    const int du = b - 128, dv = c - 128;
                    ASSERT_EQ(rgb.c0, cut((1024 * a + (hd ? 1608 : 1437) * dv + 512) / 1024));
                    ASSERT_EQ(rgb.c1,
                              cut((1024 * a - (hd ? 191 : 352) * du - (hd ? 478 : 731) * dv + 512) / 1024));
                    ASSERT_EQ(rgb.c2, cut((1024 * a + (hd ? 1931 : 1816) * du + 512) / 1024));
                }
}

TEST(QvDraw, PackedColours) {
    EXPECT_EQ(QvDraw::color32(0x00112233, ARGB), 0x33221100u);
    EXPECT_EQ(QvDraw::color32(0x44112233, BGRA), 0x44112233u);
    EXPECT_EQ(QvDraw::color32(0x44112233, BGR4), 0x44112233u);
    EXPECT_THROW(QvDraw::color32(0, BGR3), QvAssertFailure);
    unsigned char r, g, b, a;
    QvDraw::getrgba(0x44112233, &r, &g, &b, &a);
    EXPECT_TRUE(r == 0x11 && g == 0x22 && b == 0x33 && a == 0x44);
    QvDraw::getrgba(0x44112233, &r, &g, &b, nullptr);
}

TEST(QvDraw, FillsRectangles) {
    struct Case {
        int x, y, width, height, step;
        int left, top, right;
        std::vector<int> rows;
    };
    const Case cases[] = {
        {2, 1, 3, 3, 1, 2, 1, 5, {1, 2, 3}},
        {2, 1, 3, 3, 2, 2, 1, 5, {1, 3}},
        {-10, 0, 10, 1, 1, 10, 0, 20, {0}},
        {0, -3, 1, 3, 1, 0, 9, 1, {9, 10, 11}},
        {0, 0, 20, 12, 5, 0, 0, 20, {0, 5, 10}},
        {3, 4, 2, 0, 1, 3, 4, 5, {4}},  // the first row always
        {3, 4, 0, 2, 1, 3, 4, 3, {}},
        {3, 4, -2, 2, 1, 3, 4, 3, {}},
        {3, 4, 2, INT_MIN, INT_MAX, 3, 4, 5, {4}},
    };
    for (unsigned fourcc : {BGR3, BGR4, BGRA, ARGB})
        for (const auto& c : cases) {
            QvFrame frame;
            makeBlack(frame, fourcc, 20, 12);
            QvDraw::fillRect(&frame, Pair(c.x, c.y), Pair(c.width, c.height), 0x44112233, c.step);
            Pixels wanted;
            for (int row : c.rows)
                for (int x = c.left; x < c.right; ++x) wanted.insert({x, row});
            EXPECT_EQ(drawn(frame), wanted) << frame.str_four_cc() << " " << c.x << "," << c.y;
            if (c.rows.empty()) continue;
            const unsigned char* pixel = frame.pixelPtr(c.left, c.rows[0]);
            const unsigned char plain[] = {0x33, 0x22, 0x11, 0x44}, reversed[] = {0x44, 0x11, 0x22, 0x33};
            const auto bytes = static_cast<std::size_t>(frame.pixelBytes());
            EXPECT_EQ(std::memcmp(pixel, fourcc == ARGB ? reversed : plain, bytes), 0) << frame.str_four_cc();
        }
    QvFrame frame, other;
    makeBlack(frame, BGRA, 20, 12);
    QvDraw::fillRect(&frame, QvRect(1, 1, 3, 2), 5);
    EXPECT_EQ(drawn(frame), (Pixels{{1, 1}, {2, 1}}));
    makeBlack(other, YUY2, 20, 12);
    EXPECT_THROW(QvDraw::fillRect(&other, QvRect(1, 1, 3, 2), 5), QvAssertFailure);
    EXPECT_THROW(QvDraw::fillRect(&frame, QvRect(1, 1, 3, 2), 5, 0), QvAssertFailure);
    for (const QvRect& out :
         {QvRect(0, 12, 1, 13), QvRect(0, 11, 1, 13), QvRect(0, 11, 21, 12), QvRect(0, -13, 1, 1),
          QvRect(INT_MIN, 0, INT_MIN + 5, 1), QvRect(0, 5, INT_MAX, 6), QvRect(0, 5, 1, INT_MAX)})
        EXPECT_THROW(QvDraw::fillRect(&frame, out, 5), QvAssertFailure);
}

TEST(QvDraw, BlendsThreeOfFourBytes) {
    for (unsigned fourcc : {BGR3, BGR4, BGRA, ARGB}) {
        QvFrame frame;
        makeNoise(frame, fourcc, 20, 6, 0, 9);
        auto wanted = modelOf(frame);
        const int bytes = frame.pixelBytes();
        const double alpha = 0.37;
        const int blue = static_cast<int>(0x33 * alpha), green = static_cast<int>(0xC2 * alpha),
                  red = static_cast<int>(0x11 * alpha);
        const int add[] = {fourcc == ARGB ? red : blue, green, fourcc == ARGB ? blue : red};
        for (int y = 2; y < 5; ++y)
            for (int i = 0; i < 4 * 4; ++i)
                if (i % 4 < 3) {
                    auto& byte = wanted.at(0, y, 3 * bytes + i);
                    byte = static_cast<unsigned char>(static_cast<int>(byte * (1 - alpha) + add[i % 4]));
                }
        QvDraw::fillTransparent(&frame, QvRect(-17, -4, -13, -1), 0x11C233, alpha);
        EXPECT_EQ(modelOf(frame), wanted) << frame.str_four_cc();
        EXPECT_THROW(QvDraw::fillTransparent(&frame, QvRect(0, 0, 1000, 1), 0, 0.5), QvAssertFailure);
        EXPECT_THROW(QvDraw::fillTransparent(&frame, QvRect(0, 0, 1, 1000), 0, 0.5), QvAssertFailure);
    }
    QvFrame planar;
    makeBlack(planar, I420, 8, 8);
    EXPECT_THROW(QvDraw::fillTransparent(&planar, QvRect(0, 0, 1, 1), 0, 0.5), QvAssertFailure);
}

TEST(QvDraw, Lines) {
    struct Case {
        QvPoint a, b;
        Pixels pixels;
    };
    const Case cases[] = {
        {{0, 0}, {2, 1}, {{0, 0}, {1, 1}, {2, 1}}},
        {{2, 1}, {0, 0}, {{0, 0}, {1, 1}, {2, 1}}},
        {{0, 2}, {2, 1}, {{0, 2}, {1, 1}, {2, 1}}},
        {{3, 3}, {3, 3}, {{3, 3}}},
        {{4, 5}, {4, 2}, {{4, 2}, {4, 3}, {4, 4}, {4, 5}}},
        {{5, 1}, {2, 1}, {{2, 1}, {3, 1}, {4, 1}, {5, 1}}},
        {{1, 1}, {4, 4}, {{1, 1}, {2, 2}, {3, 3}, {4, 4}}},
        {{6, 0}, {5, 3}, {{6, 0}, {6, 1}, {5, 2}, {5, 3}}},
        {{5, 3}, {6, 0}, {{6, 0}, {6, 1}, {5, 2}, {5, 3}}},
        {{0, 0}, {7, 2}, {{0, 0}, {1, 0}, {2, 1}, {3, 1}, {4, 1}, {5, 1}, {6, 2}, {7, 2}}},
    };
    for (unsigned fourcc : {BGR4, BGRA, ARGB})
        for (const auto& c : cases) {
            QvFrame frame;
            makeBlack(frame, fourcc, 8, 6);
            QvDraw::drawLine(&frame, c.a, c.b, 0x010203);
            EXPECT_EQ(drawn(frame), c.pixels);
        }
    QvFrame frame;
    makeBlack(frame, BGRA, 8, 6);
    for (const QvPoint& out :
         {QvPoint(0, 6), QvPoint(8, 5), QvPoint(0, -1), QvPoint(-1, 0), QvPoint(INT_MIN, INT_MAX)})
        EXPECT_THROW(QvDraw::drawLine(&frame, {0, 0}, out, 1), QvAssertFailure);
    EXPECT_EQ(drawn(frame), Pixels());
    makeBlack(frame, BGR3, 8, 6);
    EXPECT_THROW(QvDraw::drawLine(&frame, {0, 0}, {1, 1}, 1), QvAssertFailure);
}

TEST(QvDraw, LinesEndWhereTheyShould) {
    // All lines from a centre: both ends are set and each step along has one pixel.
    for (int x = 0; x < 31; ++x)
        for (int y = 0; y < 23; ++y) {
            QvFrame frame;
            makeBlack(frame, BGRA, 31, 23);
            QvDraw::drawLine(&frame, {15, 11}, {x, y}, 1);
            const Pixels pixels = drawn(frame);
            EXPECT_TRUE(pixels.count({15, 11}) && pixels.count({x, y})) << x << "," << y;
            EXPECT_EQ(static_cast<int>(pixels.size()), std::max(std::abs(x - 15), std::abs(y - 11)) + 1);
        }
}

TEST(QvDraw, Gradients) {
    const QvColor from(0xFF8000), to(0x0010F0);
    const auto colourAt = [&](int at, int first, int last) {
        const double t = static_cast<double>(at - first) / (last - first);
        const auto mix = [t](int a, int b) { return static_cast<unsigned>(a * (1 - t) + b * t + 0.5); };
        return mix(from.c0, to.c0) << 16 | mix(from.c1, to.c1) << 8 | mix(from.c2, to.c2);
    };
    struct Case {
        QvRect rect;
        int left, top, right, bottom;  // drawn, both included; right < left: nothing
    };
    const Case cases[] = {
        {{2, 1, 9, 5}, 2, 1, 9, 5},   {{-5, -5, 100, 100}, 0, 0, 15, 9}, {{3, 1, 3, 5}, 0, 0, -1, -1},
        {{3, 4, 5, 4}, 0, 0, -1, -1}, {{20, 1, 30, 5}, 0, 0, -1, -1},
    };
    for (unsigned fourcc : {BGRA, ARGB})
        for (bool vertical : {false, true})
            for (const auto& c : cases) {
                QvFrame frame;
                makeBlack(frame, fourcc, 16, 10);
                QvDraw::fillGradient(&frame, c.rect, from, to, vertical);
                for (int y = 0; y < 10; ++y)
                    for (int x = 0; x < 16; ++x) {
                        unsigned wanted = 0, got = 0;
                        if (x >= c.left && x <= c.right && y >= c.top && y <= c.bottom)
                            wanted = vertical ? colourAt(y, c.top, c.bottom) : colourAt(x, c.left, c.right);
                        std::memcpy(&got, frame.pixelPtr(x, y), 4);
                        ASSERT_EQ(got, QvDraw::color32(wanted, fourcc)) << x << "," << y << " " << vertical;
                    }
            }
    // Sides in the wrong order: nothing along the walk, all across it.
    QvFrame frame;
    makeBlack(frame, BGRA, 16, 10);
    QvDraw::fillGradient(&frame, {9, 1, 2, 5}, from, to, false);
    QvDraw::fillGradient(&frame, {2, 5, 9, 1}, from, to, true);
    EXPECT_EQ(drawn(frame), Pixels());
    QvDraw::fillGradient(&frame, {2, 5, 9, 1}, from, to, false);
    EXPECT_EQ(drawn(frame).size(), 8u * 5u);
    makeBlack(frame, BGRA, 16, 10);
    QvDraw::fillGradient(&frame, {0, 0, 2, 1}, QvColor(76, 85, 255, true), QvColor(0), true);
    EXPECT_EQ(frame.pixelPtr(0, 0)[2], 0xfe);  // Y, U and V become red
    makeBlack(frame, BGR3, 16, 10);
    EXPECT_THROW(QvDraw::fillGradient(&frame, {0, 0, 2, 2}, from, to, true), QvAssertFailure);
}

TEST(QvDraw, Ellipses) {
    QvFrame frame;
    makeBlack(frame, BGRA, 41, 31);
    QvDraw::drawEllipse(&frame, {20, 15}, 0, 0, 1);
    EXPECT_EQ(drawn(frame), Pixels());
    QvDraw::drawEllipse(&frame, {20, 15}, 18, 12, 1);
    const Pixels pixels = drawn(frame);
    for (const auto& extreme : {std::pair(38, 15), {2, 15}, {20, 3}, {20, 27}})
        EXPECT_TRUE(pixels.count(extreme));
    for (const auto& [x, y] : pixels) {
        const double radius = std::hypot((x - 20) / 18.0, (y - 15) / 12.0);
        EXPECT_NEAR(radius, 1.0, 0.09) << x << "," << y;
    }
    EXPECT_THROW(QvDraw::drawEllipse(&frame, {20, 15}, 100, 100, 1), QvAssertFailure);
}

}  // namespace
