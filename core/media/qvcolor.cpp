// Conversion of single colours, in integers scaled by 1024.
#include <algorithm>

#include "core/media/qvdraw.h"

namespace {

constexpr int one = 1024;
constexpr int half = 512;
constexpr int chromaZero = 128;

struct ToRgb {
    int redV, greenU, greenV, blueU;
};
constexpr ToRgb toRgb[] = {{1437, 352, 731, 1816}, {1608, 191, 478, 1931}};  // BT.601, BT.709

// U and V: the factor of the channel that rises with it and its offset, and of the two that lower it.
struct Chroma {
    int up, offset, down, downGreen;
};
struct FromRgb {
    int red, green, blue;
    Chroma u, v;
};
// The V row of BT.709 has factors of its own, 514 and 512.
constexpr FromRgb fromRgb[] = {
    {306, 601, 117, {512, 512, 173, 339}, {512, 512, 83, 429}},
    {227, 733, 74, {512, 512, 117, 395}, {514, 512, 47, 467}},
};

unsigned char clamped(int value, int low = 0, int high = 255) {
    return static_cast<unsigned char>(std::clamp(value, low, high));
}

unsigned char chromaOf(const Chroma& factor, int up, int down, int green) {
    const int sum = factor.up * up + factor.offset - factor.down * down - factor.downGreen * green;
    return clamped(sum / one + chromaZero);
}

}  // namespace

void QvColor::yuv2rgb(unsigned char y, unsigned char u, unsigned char v, unsigned char* r, unsigned char* g,
                      unsigned char* b, bool hd, bool limited) {
    const ToRgb& factor = toRgb[hd ? 1 : 0];
    const int luma = one * y + half;
    const int du = u - chromaZero;
    const int dv = v - chromaZero;
    const int low = limited ? 16 : 0;
    const int high = limited ? 235 : 255;
    *r = clamped((luma + factor.redV * dv) / one, low, high);
    *g = clamped((luma - factor.greenU * du - factor.greenV * dv) / one, low, high);
    *b = clamped((luma + factor.blueU * du) / one, low, high);
}

void QvColor::rgb2yuv(unsigned char r, unsigned char g, unsigned char b, unsigned char* y, unsigned char* u,
                      unsigned char* v, bool hd) {
    const FromRgb& factor = fromRgb[hd ? 1 : 0];
    *y = clamped((factor.red * r + factor.green * g + factor.blue * b + half) / one);
    *u = chromaOf(factor.u, b, r, g);
    *v = chromaOf(factor.v, r, b, g);
}

unsigned QvColor::bgr32(bool hd) const {
    const QvColor colour = rgb(hd);
    return static_cast<unsigned>(colour.c0) << 16 | static_cast<unsigned>(colour.c1) << 8 | colour.c2;
}

QvColor QvColor::yuv(bool hd) const {
    if (isYuv) return *this;
    QvColor result(0, 0, 0, true);
    rgb2yuv(c0, c1, c2, &result.c0, &result.c1, &result.c2, hd);
    return result;
}

QvColor QvColor::rgb(bool hd) const {
    if (!isYuv) return *this;
    QvColor result;
    yuv2rgb(c0, c1, c2, &result.c0, &result.c1, &result.c2, hd, false);
    return result;
}
