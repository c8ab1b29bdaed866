#include "core/media/frameparts_p.h"

#include <algorithm>
#include <optional>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/measure/exactmath_p.h"
#include "core/media/pixelkernels_p.h"
#include "core/media/rows_p.h"

namespace {

using Byte = unsigned char;

// Where a copied area lies in source and target, in pixels of a plane.
struct Area {
    int srcX, srcY, dstX, dstY, width, height;

    Area halved() const { return {srcX / 2, srcY / 2, dstX / 2, dstY / 2, width / 2, height / 2}; }
};

Area inPlane(const Area& area, int plane) { return plane ? area.halved() : area; }

bool inside(int at, int length, int limit) {
    return at >= 0 && length >= 0 && static_cast<long long>(at) + length <= limit;
}

// Some formats hold chroma for pixel pairs or 2x2 blocks, so that only whole ones can be copied.
Area rounded(Area area, const QvPixelFormat& format) {
    const bool quarter = format.chroma == QvChroma::quarter;
    const bool pairs =
        quarter || format.chroma == QvChroma::half || format.group == 'y' || format.fourcc == QvFourcc::Y216;
    if (pairs)
        for (int* x : {&area.srcX, &area.dstX, &area.width}) *x = *x / 2 * 2;
    if (quarter)
        for (int* y : {&area.srcY, &area.dstY, &area.height}) *y = *y / 2 * 2;
    return area;
}

// The visible part of a source drawn at x, y, or nothing.
std::optional<Area> overlap(const QvFrame& dst, const QvFrame& src, int x, int y) {
    const long long srcX = x < 0 ? -static_cast<long long>(x) : 0;
    const long long srcY = y < 0 ? -static_cast<long long>(y) : 0;
    const int dstX = std::max(x, 0);
    const int dstY = std::max(y, 0);
    if (dstX >= dst.width() || srcX >= src.width()) return std::nullopt;
    // The row is held against the width; a tall target takes nothing below that.
    if (dstY >= dst.width() || dstY >= dst.height() || srcY >= src.height()) return std::nullopt;
    const int width = std::min(src.width() - static_cast<int>(srcX), dst.width() - dstX);
    const int height = std::min(src.height() - static_cast<int>(srcY), dst.height() - dstY);
    return Area{static_cast<int>(srcX) & ~1,
                static_cast<int>(srcY) & ~1,
                dstX & ~1,
                dstY & ~1,
                width & ~1,
                height & ~1};
}

const Byte* at(const QvFrame& frame, int plane, int x, int y) {
    return frame.plane(plane) + static_cast<std::ptrdiff_t>(y) * frame.stride(plane) +
           static_cast<std::ptrdiff_t>(x) * frame.pixelBytes(plane);
}

Byte* at(QvFrame& frame, int plane, int x, int y) {
    return const_cast<Byte*>(at(std::as_const(frame), plane, x, y));
}

void copyArea(QvFrame& dst, const QvFrame& src, int plane, const Area& area) {
    if (area.width <= 0 || area.height <= 0) return;
    qvrows::copy(at(dst, plane, area.dstX, area.dstY), dst.stride(plane),
                 at(src, plane, area.srcX, area.srcY), src.stride(plane),
                 static_cast<std::ptrdiff_t>(area.width) * src.pixelBytes(plane), area.height);
}

// Calls rowOp(dst, src, row) for each row of an area.
template <class RowOp>
void forRows(QvFrame& dst, const QvFrame& src, int plane, const Area& area, RowOp rowOp) {
    if (area.width <= 0) return;
    for (int row = 0; row < area.height; ++row)
        rowOp(at(dst, plane, area.dstX, area.dstY + row), at(src, plane, area.srcX, area.srcY + row), row);
}

// The fourth word of each pixel of four words.
void clearFourthWords(Byte* row, int pixels) {
    for (int i = 0; i < pixels; ++i) row[8 * i + 6] = row[8 * i + 7] = 0;
}

// One row through a mask, of which every step-th byte stands for a pixel.
void maskRow(const QvPixelFormat& format, Byte* dst, const Byte* src, const Byte* mask, int step,
             int pixels) {
    constexpr int chunk = 1024;  // pixels whose spread mask stays in the L1 cache
    Byte spread[4 * chunk];
    const auto apply = format.sampleBytes == 2 ? qvpixels::maskWords : qvpixels::maskBytes;
    const int samples = format.pixelBytes / format.sampleBytes;
    if (samples == 1 && step == 1) return apply(dst, src, mask, static_cast<std::size_t>(pixels));
    for (int done = 0; done < pixels; done += chunk) {
        const auto now = static_cast<std::size_t>(std::min(chunk, pixels - done));
        const std::ptrdiff_t offset = static_cast<std::ptrdiff_t>(done) * format.pixelBytes;
        qvpixels::spreadMask(spread, mask + static_cast<std::ptrdiff_t>(done) * step, step, samples, now);
        apply(dst + offset, src + offset, spread, now * static_cast<std::size_t>(samples));
    }
}

// Formats are held against each other and against what can be drawn.
bool checkFormats(const QvFrame& dst, const QvFrame& src) {
    QV_ASSERT(dst.inited() && src.inited());
    if (qvEqualFourcc(dst.four_cc(), src.four_cc())) return true;
    qv_dbg()->error("Can not blend - FOURCC must match");
    return false;
}

void refuseUnblendable(const QvFrame& dst) {
    QV_ASSERT_MSG(dst.four_cc() != QvFourcc::I422, "QvFrame.blend: I422 not supported");
    QV_ASSERT_MSG(dst.four_cc() != QvFourcc::v210, "QvFrame.blend: v210 not supported");
}

bool isGray(const QvFrame& mask) { return mask.four_cc() == QvFourcc::GRAY; }

bool checkMasks(const QvFrame& src, const QvFrame* mask, const QvFrame* chromaMask) {
    const bool maskFits =
        !mask || (isGray(*mask) && mask->width() == src.width() && mask->height() == src.height());
    const bool chromaFits =
        !mask || !chromaMask || !src.isPlanar() ||
        (isGray(*chromaMask) && chromaMask->width() >= src.width(1) && chromaMask->height() >= src.height(1));
    if (maskFits && chromaFits) return true;
    qv_dbg()->error("invalid blend mask, wrong dimensions or FCC");
    return false;
}

}  // namespace

int qvframes::clip(QvFrame& dst, const QvPixelFormat& format, const QvFrame& src, int srcX, int srcY,
                   int dstX, int dstY, int width, int height) {
    QV_ASSERT(dst.inited() && src.inited());
    QV_ASSERT(dst.four_cc() == src.four_cc());
    QV_ASSERT_MSG(dst.four_cc() != QvFourcc::v210, "Clip not supported for v210 colorspace");
    const Area area = rounded({srcX, srcY, dstX, dstY, width, height}, format);
    QV_ASSERT(inside(area.srcX, area.width, src.width()));
    QV_ASSERT(inside(area.srcY, area.height, src.height()));
    QV_ASSERT(inside(area.dstX, area.width, dst.width()));
    QV_ASSERT(inside(area.dstY, area.height, dst.height()));
    if (&dst == &src) return clip(dst, format, QvFrame(src), srcX, srcY, dstX, dstY, width, height);
    const int planes = format.chroma == QvChroma::half ? 1 : dst.planes();
    for (int p = 0; p < planes; ++p) copyArea(dst, src, p, inPlane(area, p));
    dst.framerate = src.framerate;
    if (area.srcY % 2 != 0) dst.framerate.reverseDominance();
    if (area.dstY % 2 != 0) dst.framerate.reverseDominance();
    return QvStatus::ok;
}

int qvframes::blend(QvFrame& dst, const QvPixelFormat& format, int x, int y, const QvFrame& src,
                    const QvFrame* mask, const QvFrame* chromaMask) {
    if (!checkFormats(dst, src) || !checkMasks(src, mask, chromaMask)) return QvStatus::failed;
    refuseUnblendable(dst);
    const auto area = overlap(dst, src, x, y);
    if (!area) return QvStatus::ok;
    if (&dst == &src) return blend(dst, format, x, y, QvFrame(src), mask, chromaMask);
    if (&dst == mask || &dst == chromaMask) {
        const QvFrame apart(dst);
        return blend(dst, format, x, y, src, &dst == mask ? &apart : mask,
                     &dst == chromaMask ? &apart : chromaMask);
    }
    for (int p = 0; p < dst.planes(); ++p) {
        const Area part = inPlane(*area, p);
        if (!mask) {
            copyArea(dst, src, p, part);
            continue;
        }
        // Without a mask of its own the chroma takes every second row and column of the luma's.
        const bool ownMask = p == 0 || chromaMask;
        const QvFrame& from = p > 0 && chromaMask ? *chromaMask : *mask;
        const Area& maskArea = ownMask ? part : *area;
        const int step = ownMask ? 1 : 2;
        forRows(dst, src, p, part, [&](Byte* dstRow, const Byte* srcRow, int row) {
            maskRow(format, dstRow, srcRow, at(from, 0, maskArea.srcX, maskArea.srcY + step * row), step,
                    part.width);
            if (dst.four_cc() == QvFourcc::b64a) clearFourthWords(dstRow, part.width);
        });
    }
    return QvStatus::ok;
}

int qvframes::blend(QvFrame& dst, const QvPixelFormat& format, int x, int y, const QvFrame& src,
                    double alpha) {
    if (!checkFormats(dst, src)) return QvStatus::failed;
    refuseUnblendable(dst);
    const auto area = overlap(dst, src, x, y);
    if (!area) return QvStatus::ok;
    if (&dst == &src) return blend(dst, format, x, y, QvFrame(src), alpha);
    const int weight = std::clamp(qvmath::truncTo<int>(alpha * 255 + 0.5), 0, 255);
    const auto mix = format.sampleBytes == 2 ? qvpixels::mixWords : qvpixels::mixBytes;
    for (int p = 0; p < dst.planes(); ++p) {
        const Area part = inPlane(*area, p);
        const int samples = part.width * format.pixelBytes / format.sampleBytes;
        forRows(dst, src, p, part, [&](Byte* dstRow, const Byte* srcRow, int) {
            mix(dstRow, srcRow, weight, static_cast<std::size_t>(samples));
            if (dst.four_cc() == QvFourcc::b64a) clearFourthWords(dstRow, part.width);
        });
    }
    return QvStatus::ok;
}
