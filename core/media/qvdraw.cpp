#include "core/media/qvdraw.h"

#include <algorithm>
#include <cmath>
#include <cstdlib>
#include <cstring>

#include "core/arch/qvassert.h"
#include "core/measure/exactmath_p.h"
#include "core/measure/rect.h"
#include "core/media/qvframe.h"
#include "core/media/rows_p.h"
#include "core/value/any.h"

namespace {

using Byte = unsigned char;

void checkRgb(const QvFrame& frame) { QV_ASSERT_MSG(frame.isRGB(), "testgen: only RGB supported"); }

int fromEdge(int position, int size) { return position < 0 ? qvmath::wrapAdd(position, size) : position; }

// The address of a pixel, of which `bytes` bytes lie within the frame's memory.
Byte* span(QvFrame& frame, int x, int y, long long bytes) {
    Byte* first = frame.pixelPtr(x, y);
    QV_ASSERT(bytes <= frame.plane() + frame.bytes(0) - first);
    return first;
}

void putPixel(Byte* pixel, unsigned value) { std::memcpy(pixel, &value, sizeof(value)); }

template <int pixelBytes>
void fillRun(Byte* first, int pixels, unsigned value) {
    for (int i = 0; i < pixels; ++i, first += pixelBytes) std::memcpy(first, &value, pixelBytes);
}

// A step of a line between its ends, one unit along the walk.
struct Walk {
    int first;   // along
    int last;    // along, not before first
    int across;  // at first
    int towards;
};

Walk walkBetween(int alongA, int acrossA, int alongB, int acrossB) {
    if (alongA > alongB) {
        std::swap(alongA, alongB);
        std::swap(acrossA, acrossB);
    }
    return {alongA, alongB, acrossA, acrossB};
}

// Distances between two ints need one bit more.
long long distance(int a, int b) { return std::llabs(static_cast<long long>(a) - b); }

QvColor blended(const QvColor& from, const QvColor& to, double t) {
    const auto mix = [t](Byte a, Byte b) {
        return static_cast<Byte>(qvmath::truncTo<int>(a * (1 - t) + b * t + 0.5));
    };
    return {mix(from.c0, to.c0), mix(from.c1, to.c1), mix(from.c2, to.c2), from.isYuv};
}

}  // namespace

void QvDraw::getrgb(unsigned colour, unsigned char* r, unsigned char* g, unsigned char* b) {
    getrgba(colour, r, g, b, nullptr);
}

void QvDraw::getrgba(unsigned colour, unsigned char* r, unsigned char* g, unsigned char* b,
                     unsigned char* a) {
    *r = static_cast<Byte>(colour >> 16);
    *g = static_cast<Byte>(colour >> 8);
    *b = static_cast<Byte>(colour);
    if (a) *a = static_cast<Byte>(colour >> 24);
}

unsigned QvDraw::color32(unsigned colour, unsigned fourcc) {
    if (fourcc == QvFourcc::ARGB) return __builtin_bswap32(colour);
    QV_ASSERT(fourcc == QvFourcc::BGR4 || fourcc == QvFourcc::BGRA);
    return colour;
}

void QvDraw::fillRect(QvFrame* frame, const Pair& pos, const Pair& size, unsigned colour, int step) {
    checkRgb(*frame);
    QV_ASSERT(step >= 1);
    const int x = fromEdge(pos.first, frame->width());
    const int y = fromEdge(pos.second, frame->height());
    const unsigned value = frame->four_cc() == QvFourcc::BGR3 ? colour : color32(colour, frame->four_cc());
    if (size.first <= 0) return;
    const int pixelBytes = frame->pixelBytes();
    const long long rowBytes = static_cast<long long>(size.first) * pixelBytes;
    Byte* first = span(*frame, x, y, rowBytes);
    (pixelBytes == 3 ? fillRun<3> : fillRun<4>)(first, size.first, value);
    const int copies = size.second > 0 ? (size.second - 1) / step : 0;
    if (copies == 0) return;
    span(*frame, x, qvmath::wrapAdd(y, copies * step), rowBytes);
    const std::ptrdiff_t stride = static_cast<std::ptrdiff_t>(frame->stride()) * step;
    qvrows::copy(first + stride, stride, first, 0, static_cast<std::ptrdiff_t>(rowBytes), copies);
}

void QvDraw::fillRect(QvFrame* frame, const QvRect& rect, unsigned colour, int step) {
    fillRect(frame, Pair(rect.left(), rect.top()), Pair(rect.width(), rect.height()), colour, step);
}

void QvDraw::fillTransparent(QvFrame* frame, const QvRect& rect, unsigned colour, double alpha) {
    checkRgb(*frame);
    const int x = fromEdge(rect.left(), frame->width());
    const int y = fromEdge(rect.top(), frame->height());
    if (rect.width() <= 0 || rect.height() <= 0) return;
    const long long rowBytes = 4LL * rect.width();
    Byte* row = span(*frame, x, y, rowBytes);
    span(*frame, x, qvmath::wrapAdd(y, rect.height() - 1), rowBytes);

    Byte r = 0, g = 0, b = 0;
    getrgb(colour, &r, &g, &b);
    const auto scaled = [alpha](Byte channel) {
        return static_cast<Byte>(qvmath::truncTo<int>(channel * alpha));
    };
    const bool argb = frame->four_cc() == QvFourcc::ARGB;
    const Byte add[] = {scaled(argb ? r : b), scaled(g), scaled(argb ? b : r)};
    for (int i = 0; i < rect.height(); ++i, row += frame->stride())
        for (Byte* pixel = row; pixel < row + rowBytes; pixel += 4)
            for (int n = 0; n < 3; ++n)
                pixel[n] = static_cast<Byte>(qvmath::truncTo<int>(pixel[n] * (1 - alpha) + add[n]));
}

void QvDraw::fillGradient(QvFrame* frame, const QvRect& rect, const QvColor& from, const QvColor& to,
                          bool vertical) {
    const auto clampTo = [](int value, int size) { return std::max(std::min(value, size - 1), 0); };
    const int left = clampTo(rect.left(), frame->width()), right = clampTo(rect.right(), frame->width());
    const int top = clampTo(rect.top(), frame->height()), bottom = clampTo(rect.bottom(), frame->height());
    if (left == right || top == bottom) return;
    const auto colourAt = [&](int at, int first, int last) {
        return blended(from, to, static_cast<double>(at - first) / (last - first)).bgr32(false);
    };
    if (vertical) {
        for (int y = top; y <= bottom; ++y) drawLine(frame, {left, y}, {right, y}, colourAt(y, top, bottom));
        return;
    }
    // All rows are alike: the first is drawn pixel by pixel.
    const int upper = std::min(top, bottom);
    for (int x = left; x <= right; ++x) drawLine(frame, {x, upper}, {x, upper}, colourAt(x, left, right));
    if (left > right) return;
    const long long rowBytes = 4LL * (right - left + 1);
    const Byte* row = span(*frame, left, upper, rowBytes);
    const int lower = std::max(top, bottom);
    Byte* next = span(*frame, left, lower, rowBytes) -
                 static_cast<std::ptrdiff_t>(lower - upper - 1) * frame->stride();
    qvrows::copy(next, frame->stride(), row, 0, static_cast<std::ptrdiff_t>(rowBytes), lower - upper);
}

void QvDraw::drawLine(QvFrame* frame, const QvPoint& a, const QvPoint& b, unsigned colour) {
    const unsigned value = color32(colour, frame->four_cc());
    // All pixels of the line lie between these two.
    frame->pixelPtr(std::min(a.x(), b.x()), std::min(a.y(), b.y()));
    span(*frame, std::max(a.x(), b.x()), std::max(a.y(), b.y()), 4);

    Byte* origin = frame->plane();
    const std::ptrdiff_t stride = frame->stride();
    const bool steep = distance(a.y(), b.y()) > distance(a.x(), b.x());
    const Walk walk =
        steep ? walkBetween(a.y(), a.x(), b.y(), b.x()) : walkBetween(a.x(), a.y(), b.x(), b.y());
    const std::ptrdiff_t alongStep = steep ? stride : 4;
    const std::ptrdiff_t acrossStep = (steep ? 4 : stride) * (walk.across < walk.towards ? 1 : -1);
    const double slope = walk.across == walk.towards
                             ? 0.0
                             : static_cast<double>(distance(walk.towards, walk.across)) /
                                   static_cast<double>(distance(walk.last, walk.first));
    Byte* pixel = origin + walk.first * alongStep + walk.across * (steep ? 4 : stride);
    double error = 0.0;
    for (int at = walk.first; at <= walk.last; ++at, pixel += alongStep) {
        putPixel(pixel, value);
        error += slope;
        if (error >= 0.5) {
            pixel += acrossStep;
            error -= 1.0;
        }
    }
}

void QvDraw::drawEllipse(QvFrame* frame, QvPoint centre, int rx, int ry, unsigned colour) {
    QvPoint pen(qvmath::wrapAdd(centre.x(), rx), centre.y());
    for (int degree = 1; degree <= 360; ++degree) {
        const double angle = degree * 3.14159265 / 180;
        const QvPoint point(qvmath::truncTo<int>(centre.x() + std::cos(angle) * rx + 0.5),
                            qvmath::truncTo<int>(centre.y() + std::sin(angle) * ry + 0.5));
        if (point == pen) continue;
        drawLine(frame, pen, point, colour);
        pen = point;
    }
}
