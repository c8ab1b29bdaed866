#include "core/media/framefill_p.h"

#include <array>
#include <cstring>

#include "core/media/rows_p.h"

namespace {

using Pattern = std::array<unsigned char, 4>;

// Black of plane 0, four bytes that repeat from each row's start.
Pattern blackPattern(unsigned fourcc) {
    switch (fourcc) {
        case QvFourcc::YUY2:
        case QvFourcc::YUYV: return {0, 128, 0, 128};
        case QvFourcc::UYVY: return {128, 0, 128, 0};
        case QvFourcc::Y216: return {0, 0, 0, 128};  // words 1 and 3 of four are 0x8000
        default: return {};
    }
}

void fillPlane(unsigned char* plane, int stride, int planeBytes, const Pattern& pattern) {
    const int first = std::min(stride, planeBytes);
    for (int i = 0; i < first; ++i) plane[i] = pattern[static_cast<unsigned>(i) & 3];
    qvrows::repeatFirst(plane, stride, planeBytes);
}

}  // namespace

void qvframes::setBlack(QvFrame& frame, const QvPixelFormat& format) {
    const Pattern chroma = format.sampleBytes == 2 ? Pattern{0, 128, 0, 128} : Pattern{128, 128, 128, 128};
    for (int p = 0; p < frame.planes(); ++p)
        fillPlane(frame.plane(p), frame.stride(p), frame.bytes(p),
                  p ? chroma : blackPattern(frame.four_cc()));
}

void qvframes::setRGB(QvFrame& frame, unsigned char r, unsigned char g, unsigned char b) {
    if (!frame.isRGB() || frame.bytes(0) == 0) return;
    // ARGB shares the step of BGR3, and keeps it.
    const int step = frame.four_cc() == QvFourcc::BGR4 || frame.four_cc() == QvFourcc::BGRA ? 4 : 3;
    unsigned char* pixel = frame.plane();
    for (int x = 0; x < frame.width(); ++x, pixel += step) {
        pixel[0] = b;
        pixel[1] = g;
        pixel[2] = r;
    }
    qvrows::repeatFirst(frame.plane(), frame.stride(), frame.bytes(0));
}
