// Drawing into the pixels of an RGB frame.
#pragma once

#include "core/arch/api.h"

class QvFrame;
class QvPoint;
class QvRect;
struct Pair;

// A colour: red, green, blue, or with isYuv Y, U, V. `hd` chooses the BT.709 coefficients.
class QV_API QvColor {
  public:
    unsigned char c0 = 0;
    unsigned char c1 = 0;
    unsigned char c2 = 0;
    bool isYuv = false;

    constexpr QvColor() = default;
    constexpr QvColor(unsigned char first, unsigned char second, unsigned char third, bool yuvFlag)
        : c0(first), c1(second), c2(third), isYuv(yuvFlag) {}
    explicit constexpr QvColor(unsigned rgb)  // 0xRRGGBB
        : c0(rgb >> 16 & 255), c1(rgb >> 8 & 255), c2(rgb & 255) {}

    unsigned bgr32(bool hd) const;  // 0xRRGGBB
    QvColor yuv(bool hd) const;
    QvColor rgb(bool hd) const;

    // `limited` clamps the result to 16 to 235 instead of 0 to 255.
    static void yuv2rgb(unsigned char y, unsigned char u, unsigned char v, unsigned char* r, unsigned char* g,
                        unsigned char* b, bool hd, bool limited);
    static void rgb2yuv(unsigned char r, unsigned char g, unsigned char b, unsigned char* y, unsigned char* u,
                        unsigned char* v, bool hd);
};

// A packed colour is 0xRRGGBB, or 0xAARRGGBB where an alpha is read.
//
// Nothing clips, apart from fillGradient: what would leave the plane is an assertion, and so is a frame of
// another format than stated. Lines, ellipses and gradients take BGR4, BGRA and ARGB.
class QV_API QvDraw {
  public:
    static void getrgb(unsigned colour, unsigned char* r, unsigned char* g, unsigned char* b);
    // `a` may be null.
    static void getrgba(unsigned colour, unsigned char* r, unsigned char* g, unsigned char* b,
                        unsigned char* a);
    // The pixel of a 32-bit format as a little-endian value.
    static unsigned color32(unsigned colour, unsigned fourcc);

    // Every step-th row of a rectangle, the first always; step is at least 1. A negative position counts from
    // the right or the bottom edge. BGR3 as well.
    static void fillRect(QvFrame* frame, const Pair& pos, const Pair& size, unsigned colour, int step = 1);
    static void fillRect(QvFrame* frame, const QvRect& rect, unsigned colour, int step = 1);

    // old * (1 - alpha) + colour * alpha on bytes 0, 1 and 2 of every four. In ARGB these are alpha, red and
    // green; BGR3 is walked in fours, too.
    static void fillTransparent(QvFrame* frame, const QvRect& rect, unsigned colour, double alpha);

    // From the left to the right side, or with `vertical` from top to bottom, right and bottom included, and
    // clamped to the frame. A rectangle whose sides coincide draws nothing. from.isYuv holds for both
    // colours.
    static void fillGradient(QvFrame* frame, const QvRect& rect, const QvColor& from, const QvColor& to,
                             bool vertical);

    // One pixel wide, both ends included.
    static void drawLine(QvFrame* frame, const QvPoint& a, const QvPoint& b, unsigned colour);
    // The outline in 360 chords; radii of 0 draw nothing.
    static void drawEllipse(QvFrame* frame, QvPoint centre, int rx, int ry, unsigned colour);
};
