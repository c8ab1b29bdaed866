#include "core/media/qvdraw.h"

#include <algorithm>
#include <climits>
#include <cmath>
#include <cstring>
#include <set>

#include "core/media/rect.h"
#include "tests/core/media/frame_model.h"
#include "tests/support/checks.h"

namespace {

using namespace QvFourcc;
using Pixels = std::set<std::pair<int, int>>;

struct Black : QvFrame {
    Black(unsigned fourcc, int width, int height) {
        init(fourcc, width, height);
        setBlack();
    }
};

// Places whose pixel is not black; the picture's pixels have 3 or 4 bytes.
Pixels drawn(const QvFrame& frame) {
    Pixels found;
    for (int y = 0; y < frame.height(); ++y)
        for (int x = 0; x < frame.width(); ++x)
            if (std::any_of(frame.pixelPtr(x, y), frame.pixelPtr(x, y) + frame.pixelBytes(),
                            [](int b) { return b; }))
                found.insert({x, y});
    return found;
}

TEST(QvColor, ConvertsBothWays) {
    const struct {
        QvColor in;
        bool hd;
        unsigned out;
    } toYuv[] = {
        {QvColor(0xffffff), true, 0xff8080}, {QvColor(0xff0000), false, 0x4c56ff},
        {QvColor(0xff0000), true, 0x3964ff}, {QvColor(0x00ff00), false, 0x962d16},
        {QvColor(0x00ff00), true, 0xb71f0d}, {QvColor(0x0000ff), false, 0x1dff6c},
        {QvColor(0x0000ff), true, 0x12ff75}, {{1, 2, 3, true}, true, 0x010203},
    };
    for (const auto& c : toYuv) {
        const QvColor got = c.in.yuv(c.hd);
        EXPECT_TRUE(got.isYuv);
        EXPECT_EQ(QvColor(got.c0, got.c1, got.c2, false).bgr32(false), c.out) << std::hex << c.out;
    }
    const struct {
        QvColor in;
        bool hd;
        unsigned out;
    } toRgb[] = {
        {{100, 128, 160, true}, false, 0x914d64}, {{100, 128, 160, true}, true, 0x965564},
        {{100, 160, 128, true}, false, 0x64599d}, {{100, 160, 128, true}, true, 0x645ea0},
        {{90, 30, 150, true}, false, 0x796c00},   {{90, 30, 150, true}, true, 0x7d6200},
        {{0, 0, 0, true}, false, 0x008700},       {{255, 255, 255, true}, true, 0xffacff},
        {QvColor(0x123456), true, 0x123456},
    };
    for (const auto& c : toRgb) EXPECT_EQ(c.in.bgr32(c.hd), c.out) << std::hex << c.in.bgr32(c.hd);
    unsigned char r = 0, g = 0, b = 0;
    QvColor::yuv2rgb(255, 128, 0, &r, &g, &b, false, true);
    EXPECT_TRUE(r == 75 && g == 235 && b == 235);
}

TEST(QvDraw, PackedColours) {
    EXPECT_EQ(QvDraw::color32(0x00112233, ARGB), 0x33221100u);
    for (unsigned fourcc : {BGRA, BGR4}) EXPECT_EQ(QvDraw::color32(0x44112233, fourcc), 0x44112233u);
    EXPECT_THROW(QvDraw::color32(0, BGR3), QvAssertFailure);
    unsigned char r, g, b, a;
    QvDraw::getrgba(0x44112233, &r, &g, &b, &a);
    EXPECT_TRUE(r == 0x11 && g == 0x22 && b == 0x33 && a == 0x44);
    QvDraw::getrgba(0x44112233, &r, &g, &b, nullptr);
}

TEST(QvDraw, FillsRectangles) {
    const struct {
        int x, y, width, height, step;
        int left, right;
        std::vector<int> rows;
    } cases[] = {
        {2, 1, 3, 3, 2, 2, 5, {1, 3}},       {-10, 0, 10, 1, 1, 10, 20, {0}},
        {0, -3, 1, 3, 1, 0, 1, {9, 10, 11}}, {0, 0, 20, 12, 5, 0, 20, {0, 5, 10}},
        {3, 4, 2, 0, 1, 3, 5, {4}},  // the first row always
        {3, 4, -2, 2, 1, 3, 3, {}},          {3, 4, 2, INT_MIN, INT_MAX, 3, 5, {4}},
    };
    for (unsigned fourcc : {BGR3, BGR4, BGRA, ARGB})
        for (const auto& c : cases) {
            Black frame(fourcc, 20, 12);
            QvDraw::fillRect(&frame, Pair(c.x, c.y), Pair(c.width, c.height), 0x44112233, c.step);
            Pixels wanted;
            for (int row : c.rows)
                for (int x = c.left; x < c.right; ++x) wanted.insert({x, row});
            EXPECT_EQ(drawn(frame), wanted) << frame.str_four_cc() << " " << c.x << "," << c.y;
            if (c.rows.empty()) continue;
            const char* pixel = fourcc == ARGB ? "\x44\x11\x22\x33" : "\x33\x22\x11\x44";
            EXPECT_TRUE(std::equal(pixel, pixel + frame.pixelBytes(),
                                   reinterpret_cast<char*>(frame.pixelPtr(c.left, c.rows[0]))));
        }
    Black frame(BGRA, 20, 12), other(YUY2, 20, 12);
    QvDraw::fillRect(&frame, QvRect(1, 1, 3, 2), 5);
    EXPECT_EQ(drawn(frame), (Pixels{{1, 1}, {2, 1}}));
    EXPECT_THROW(QvDraw::fillRect(&other, QvRect(1, 1, 3, 2), 5), QvAssertFailure);
    EXPECT_THROW(QvDraw::fillRect(&frame, QvRect(1, 1, 3, 2), 5, 0), QvAssertFailure);
    for (const QvRect& out :
         {QvRect(0, 12, 1, 13), QvRect(0, 11, 1, 13), QvRect(0, 11, 21, 12), QvRect(0, -13, 1, 1),
          QvRect(INT_MIN, 0, INT_MIN + 5, 1), QvRect(0, 5, INT_MAX, 6), QvRect(0, 5, 1, INT_MAX)})
        EXPECT_THROW(QvDraw::fillRect(&frame, out, 5), QvAssertFailure);
}

TEST(QvDraw, BlendsThreeOfFourBytes) {
    for (unsigned fourcc : {BGR3, BGRA, ARGB}) {
        QvFrame frame;
        makeNoise(frame, fourcc, 20, 6, 0, 9);
        auto wanted = modelOf(frame);
        const double alpha = 0.37;
        int add[] = {static_cast<int>(0x33 * alpha), static_cast<int>(0xC2 * alpha),
                     static_cast<int>(0x11 * alpha)};
        if (fourcc == ARGB) std::swap(add[0], add[2]);
        for (int y = 2; y < 5; ++y)
            for (int i = 0; i < 4 * 4; ++i)
                if (i % 4 < 3) {
                    auto& byte = wanted.at(0, y, 3 * frame.pixelBytes() + i);
                    byte = static_cast<unsigned char>(byte * (1 - alpha) + add[i % 4]);
                }
        QvDraw::fillTransparent(&frame, QvRect(-17, -4, -13, -1), 0x11C233, alpha);
        EXPECT_EQ(modelOf(frame), wanted) << frame.str_four_cc();
        for (const QvRect& out : {QvRect(0, 0, 1000, 1), QvRect(0, 0, 1, 1000)})
            EXPECT_THROW(QvDraw::fillTransparent(&frame, out, 0, 0.5), QvAssertFailure);
    }
    Black planar(I420, 8, 8);
    EXPECT_THROW(QvDraw::fillTransparent(&planar, QvRect(0, 0, 1, 1), 0, 0.5), QvAssertFailure);
}

TEST(QvDraw, Lines) {
    const struct {
        QvPoint a, b;
        Pixels pixels;
    } cases[] = {
        {{0, 0}, {2, 1}, {{0, 0}, {1, 1}, {2, 1}}},
        {{3, 3}, {3, 3}, {{3, 3}}},
        {{5, 1}, {2, 1}, {{2, 1}, {3, 1}, {4, 1}, {5, 1}}},
        {{1, 1}, {4, 4}, {{1, 1}, {2, 2}, {3, 3}, {4, 4}}},
        {{6, 0}, {5, 3}, {{6, 0}, {6, 1}, {5, 2}, {5, 3}}},
        {{0, 0}, {7, 2}, {{0, 0}, {1, 0}, {2, 1}, {3, 1}, {4, 1}, {5, 1}, {6, 2}, {7, 2}}},
    };
    for (unsigned fourcc : {BGR4, ARGB})
        for (const auto& c : cases) {
            Black frame(fourcc, 8, 6);
            QvDraw::drawLine(&frame, c.a, c.b, 0x010203);
            EXPECT_EQ(drawn(frame), c.pixels);
        }
    Black frame(BGRA, 8, 6), packed(BGR3, 8, 6);
    for (const QvPoint& out :
         {QvPoint(0, 6), QvPoint(8, 5), QvPoint(0, -1), QvPoint(-1, 0), QvPoint(INT_MIN, INT_MAX)})
        EXPECT_THROW(QvDraw::drawLine(&frame, {0, 0}, out, 1), QvAssertFailure);
    EXPECT_EQ(drawn(frame), Pixels());
    EXPECT_THROW(QvDraw::drawLine(&packed, {0, 0}, {1, 1}, 1), QvAssertFailure);
}

TEST(QvDraw, Gradients) {
    const QvColor from(0xFF8000), to(0x0010F0);
    const auto colourAt = [&](int at, int first, int last) {
        const double t = static_cast<double>(at - first) / (last - first);
        const auto mix = [t](int a, int b) { return static_cast<unsigned>(a * (1 - t) + b * t + 0.5); };
        return mix(from.c0, to.c0) << 16 | mix(from.c1, to.c1) << 8 | mix(from.c2, to.c2);
    };
    const struct {
        QvRect rect, drawn;  // the second with both ends included
    } cases[] = {{{2, 1, 9, 5}, {2, 1, 9, 5}}, {{-5, -5, 100, 100}, {0, 0, 15, 9}}};
    for (unsigned fourcc : {BGRA, ARGB})
        for (bool vertical : {false, true})
            for (const auto& c : cases) {
                Black frame(fourcc, 16, 10);
                QvDraw::fillGradient(&frame, c.rect, from, to, vertical);
                const QvRect& d = c.drawn;
                for (int y = 0; y < 10; ++y)
                    for (int x = 0; x < 16; ++x) {
                        unsigned wanted = 0, got = 0;
                        if (d.contains({x, y, x, y}) && vertical) wanted = colourAt(y, d.top(), d.bottom());
                        if (d.contains({x, y, x, y}) && !vertical) wanted = colourAt(x, d.left(), d.right());
                        std::memcpy(&got, frame.pixelPtr(x, y), 4);
                        ASSERT_EQ(got, QvDraw::color32(wanted, fourcc)) << x << "," << y << " " << vertical;
                    }
            }
    // Sides that coincide: nothing. In the wrong order: nothing along the walk, all across it.
    Black frame(BGRA, 16, 10), yuv(BGRA, 16, 10), packed(BGR3, 16, 10);
    for (bool vertical : {false, true})
        for (const QvRect& none : {QvRect(3, 1, 3, 5), QvRect(3, 4, 5, 4), QvRect(20, 1, 30, 5)})
            QvDraw::fillGradient(&frame, none, from, to, vertical);
    QvDraw::fillGradient(&frame, {9, 1, 2, 5}, from, to, false);
    QvDraw::fillGradient(&frame, {2, 5, 9, 1}, from, to, true);
    EXPECT_EQ(drawn(frame), Pixels());
    QvDraw::fillGradient(&frame, {2, 5, 9, 1}, from, to, false);
    EXPECT_EQ(drawn(frame).size(), 8u * 5u);
    QvDraw::fillGradient(&yuv, {0, 0, 2, 1}, QvColor(76, 85, 255, true), QvColor(0), true);
    EXPECT_EQ(yuv.pixelPtr(0, 0)[2], 0xfe);  // Y, U and V become red
    EXPECT_THROW(QvDraw::fillGradient(&packed, {0, 0, 2, 2}, from, to, true), QvAssertFailure);
}

TEST(QvDraw, Ellipses) {
    Black frame(BGRA, 41, 31);
    QvDraw::drawEllipse(&frame, {20, 15}, 0, 0, 1);
    EXPECT_EQ(drawn(frame), Pixels());
    QvDraw::drawEllipse(&frame, {20, 15}, 18, 12, 1);
    const Pixels pixels = drawn(frame);
    for (const auto& extreme : {std::pair(38, 15), {2, 15}, {20, 3}, {20, 27}})
        EXPECT_TRUE(pixels.count(extreme));
    for (const auto& [x, y] : pixels)
        EXPECT_NEAR(std::hypot((x - 20) / 18.0, (y - 15) / 12.0), 1.0, 0.09) << x << "," << y;
    EXPECT_THROW(QvDraw::drawEllipse(&frame, {20, 15}, 100, 100, 1), QvAssertFailure);
}

}  // namespace
