// Frames of one colour.
#include <array>
#include <cstring>

#include "core/arch/qvassert.h"
#include "core/media/qvframe.h"
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

void QvFrame::setBlack() {
    QV_ASSERT(inited_);
    const Pattern chroma = format_->sampleBytes == 2 ? Pattern{0, 128, 0, 128} : Pattern{128, 128, 128, 128};
    for (int p = 0; p < planes_; ++p)
        fillPlane(tt_.planes[p], tt_.strides[p], planeBytes_[p], p ? chroma : blackPattern(four_cc()));
}

void QvFrame::setRGB(unsigned char r, unsigned char g, unsigned char b) {
    if (!isRGB() || planeBytes_[0] == 0) return;
    // ARGB shares the step of BGR3, and keeps it.
    const int step = four_cc() == QvFourcc::BGR4 || four_cc() == QvFourcc::BGRA ? 4 : 3;
    unsigned char* pixel = tt_.planes[0];
    for (int x = 0; x < tt_.width; ++x, pixel += step) {
        pixel[0] = b;
        pixel[1] = g;
        pixel[2] = r;
    }
    qvrows::repeatFirst(tt_.planes[0], tt_.strides[0], planeBytes_[0]);
}
