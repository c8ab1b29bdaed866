#include "core/media/qvdraw.h"

#include <set>

#include "core/measure/rect.h"
#include "core/media/qvframe.h"
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
        {QvColor(0xffffff), true, 0xff8080},
        {QvColor(0xff0000), false, 0x4c56ff},
        {QvColor(0x00ff00), true, 0xb71f0d},
        {QvColor(0x0000ff), false, 0x1dff6c},
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
        {{0, 0, 0, true}, false, 0x008700},       {{255, 255, 255, true}, true, 0xffacff},
    };
    for (const auto& c : toRgb) EXPECT_EQ(c.in.bgr32(c.hd), c.out) << std::hex << c.in.bgr32(c.hd);
    for (const auto& [luma, limited, level] :
         {std::tuple{255, true, 235}, {0, true, 16}, {255, false, 255}, {0, false, 0}}) {
        unsigned char r = 1, g = 1, b = 1;
        QvColor::yuv2rgb(static_cast<unsigned char>(luma), 128, 128, &r, &g, &b, true, limited);
        EXPECT_TRUE(r == level && g == level && b == level) << luma << " " << limited;
    }
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
    Black frame(BGRA, 20, 12);
    for (const QvRect& out :
         {QvRect(0, 12, 1, 13), QvRect(0, 11, 1, 13), QvRect(0, 11, 21, 12), QvRect(0, -13, 1, 1),
          QvRect(INT_MIN, 0, INT_MIN + 5, 1), QvRect(0, 5, INT_MAX, 6), QvRect(0, 5, 1, INT_MAX)})
        EXPECT_THROW(QvDraw::fillRect(&frame, out, 5), QvAssertFailure);
}

TEST(QvDraw, BlendsThreeOfFourBytes) {
    Black frame(BGRA, 20, 6);
    QvDraw::fillRect(&frame, QvRect(0, 0, 20, 6), 0x64646464);
    QvDraw::fillTransparent(&frame, QvRect(-17, -4, -13, -1), 0x11C233, 0.37);
    for (int y = 0; y < 6; ++y)
        for (int x = 0; x < 20; ++x) {
            const bool inside = x >= 3 && x < 7 && y >= 2 && y < 5;
            EXPECT_EQ(std::memcmp(frame.pixelPtr(x, y), inside ? "\x51\x86\x45\x64" : "dddd", 4), 0)
                << x << y;
        }
    for (const QvRect& out : {QvRect(0, 0, 1000, 1), QvRect(0, 0, 1, 1000)})
        EXPECT_THROW(QvDraw::fillTransparent(&frame, out, 0, 0.5), QvAssertFailure);
}

TEST(QvDraw, Lines) {
    const struct {
        QvPoint a, b;
        Pixels pixels;
    } cases[] = {
        {{0, 0}, {2, 1}, {{0, 0}, {1, 1}, {2, 1}}},
        {{5, 1}, {2, 1}, {{2, 1}, {3, 1}, {4, 1}, {5, 1}}},
        {{6, 0}, {5, 3}, {{6, 0}, {6, 1}, {5, 2}, {5, 3}}},
        {{0, 0}, {7, 2}, {{0, 0}, {1, 0}, {2, 1}, {3, 1}, {4, 1}, {5, 1}, {6, 2}, {7, 2}}},
    };
    for (unsigned fourcc : {BGR4, ARGB})
        for (const auto& c : cases) {
            Black frame(fourcc, 8, 6);
            QvDraw::drawLine(&frame, c.a, c.b, 0x010203);
            EXPECT_EQ(drawn(frame), c.pixels);
        }
    Black frame(BGRA, 8, 6);
    for (const QvPoint& out :
         {QvPoint(0, 6), QvPoint(8, 5), QvPoint(0, -1), QvPoint(-1, 0), QvPoint(INT_MIN, INT_MAX)})
        EXPECT_THROW(QvDraw::drawLine(&frame, {0, 0}, out, 1), QvAssertFailure);
    EXPECT_EQ(drawn(frame), Pixels());
}

TEST(QvDraw, Gradients) {
    const QvColor from(0xFF8000), to(0x0010F0);
    const auto red = [](const QvFrame& frame, int x, int y) { return int{frame.pixelPtr(x, y)[2]}; };
    Black across(BGRA, 16, 10), down(BGRA, 16, 10), all(BGRA, 16, 10);
    QvDraw::fillGradient(&across, {2, 1, 7, 5}, from, to, false);
    QvDraw::fillGradient(&down, {2, 1, 7, 5}, from, to, true);
    EXPECT_TRUE(red(across, 2, 3) == 255 && red(across, 4, 3) == 153 && red(across, 7, 3) == 0);
    EXPECT_TRUE(red(down, 3, 1) == 255 && red(down, 3, 2) == 191 && red(down, 3, 5) == 0);
    EXPECT_EQ(drawn(across).size(), 6u * 5u);  // both ends included
    for (const QvRect& none : {QvRect(3, 1, 3, 5), QvRect(20, 1, 30, 5), QvRect(9, 1, 2, 5)})
        QvDraw::fillGradient(&all, none, from, to, false);
    EXPECT_EQ(drawn(all), Pixels());
    QvDraw::fillGradient(&all, {-5, -5, 100, 100}, from, to, false);
    EXPECT_EQ(drawn(all).size(), 160u);
}

}  // namespace
