#include "core/media/framefields_p.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/pixelkernels_p.h"
#include "core/media/rows_p.h"

namespace {

int rowBytes(const QvFrame& a, const QvFrame& b, int plane) {
    return std::min(a.stride(plane), b.stride(plane));
}

// Target rows dstFirst, dstFirst + dstStep, ... take source rows srcFirst, srcFirst + srcStep, ...
struct RowWalk {
    int dstFirst = 0;
    int dstStep = 1;
    int srcFirst = 0;
    int srcStep = 1;
};

void copyPlaneRows(QvFrame& dst, const QvFrame& src, int plane, int rows, const RowWalk& walk) {
    if (rows <= 0) return;
    const std::ptrdiff_t dstStride = dst.stride(plane);
    const std::ptrdiff_t srcStride = src.stride(plane);
    qvrows::copy(dst.plane(plane) + walk.dstFirst * dstStride, walk.dstStep * dstStride,
                 src.plane(plane) + walk.srcFirst * srcStride, walk.srcStep * srcStride,
                 rowBytes(dst, src, plane), rows);
}

bool sameShape(const QvFrame& a, const QvFrame& b) {
    return a.four_cc() == b.four_cc() && a.width() == b.width() && a.height() == b.height();
}

bool checkFields(const QvFrame& first, const QvFrame& second) {
    QV_ASSERT(first.inited() && second.inited());
    if (sameShape(first, second)) return true;
    qv_dbg()->error("top and bottom fields different");
    return false;
}

int halfHeight(const QvFrame& src) {
    const int half = src.height() / 2;
    return src.is420() ? half & ~1 : half;
}

bool hasWords(const QvFrame& frame) { return qvPixelFormat(frame.four_cc())->sampleBytes == 2; }

bool sameFormat(const QvFrame& frame, unsigned four_cc, int width, int height) {
    return frame.inited() && frame.four_cc() == four_cc && frame.width() == width && frame.height() == height;
}

// The planes of an empty frame, or of another format, are replaced.
int takeFormat(QvFrame& dst, unsigned four_cc, int width, int height) {
    return sameFormat(dst, four_cc, width, height) ? QvStatus::ok : dst.init(four_cc, width, height);
}

}  // namespace

int qvframes::copy(QvFrame& dst, const QvFrame& src, bool flip) {
    if (&dst == &src) return flip ? copy(dst, QvFrame(src), true) : QvStatus::ok;
    if (!src.inited()) dst.destroy();
    const int status =
        src.inited() ? takeFormat(dst, src.four_cc(), src.width(), src.height()) : QvStatus::ok;
    for (int p = 0; p < dst.planes(); ++p) {
        const int rows = dst.height(p);
        copyPlaneRows(dst, src, p, rows, flip ? RowWalk{.dstFirst = rows - 1, .dstStep = -1} : RowWalk{});
    }
    dst.copyMeta(src);
    if (flip) dst.framerate.reverseDominance();
    return status;
}

int qvframes::copyFramett(QvFrame& dst, const frame_tt& tt, bool keepStrides) {
    if (&tt == dst.getFrame_tt()) return QvStatus::ok;
    const frame_tt from = tt;
    if (!sameFormat(dst, from.four_cc, from.width, from.height)) {
        const AnyVector strides(from.strides[0], from.strides[1], from.strides[2]);
        const int status =
            dst.init(from.four_cc, from.width, from.height, nullptr, keepStrides ? &strides : nullptr);
        if (status != QvStatus::ok) return status;
    }
    for (int p = 0; p < dst.planes(); ++p) {
        QV_ASSERT(from.planes[p] != nullptr || dst.plane_bytes(p) == 0);
        const long long theirs = std::llabs(static_cast<long long>(from.strides[p]));
        qvrows::copy(dst.plane(p), dst.stride(p), from.planes[p], from.strides[p],
                     static_cast<std::ptrdiff_t>(std::min<long long>(dst.stride(p), theirs)), dst.height(p));
    }
    return QvStatus::ok;
}

int qvframes::copyShifted(QvFrame& dst, const QvFrame& src) {
    QV_ASSERT(src.inited());
    if (&dst == &src) return copyShifted(dst, QvFrame(src));
    const int status = takeFormat(dst, src.four_cc(), src.width(), src.height());
    for (int p = 0; p < dst.planes(); ++p) {
        const int rows = dst.height(p);
        copyPlaneRows(dst, src, p, rows - 1, {.srcFirst = 1});
        // Below three rows there is no row of the same field to repeat.
        if (rows >= 3)
            copyPlaneRows(dst, dst, p, 1, {.dstFirst = rows - 1, .srcFirst = rows - 3});
        else
            copyPlaneRows(dst, src, p, std::min(rows, 1), {.dstFirst = rows - 1, .srcFirst = rows - 1});
    }
    dst.copyMeta(src);
    dst.framerate.reverseDominance();
    return status;
}

int qvframes::changeDominance(QvFrame& dst, bool up) {
    QV_ASSERT(dst.inited());
    for (int p = 0; p < dst.planes(); ++p) {
        const std::ptrdiff_t stride = dst.stride(p);
        const std::ptrdiff_t rows = stride > 0 ? dst.plane_bytes(p) / stride : 0;
        if (rows < 2) continue;
        unsigned char* first = dst.plane(p);
        const auto moved = static_cast<std::size_t>((rows - 1) * stride);
        std::memmove(up ? first : first + stride, up ? first + stride : first, moved);
        if (rows < 3) continue;
        unsigned char* refilled = up ? first + (rows - 1) * stride : first;
        std::memcpy(refilled, up ? refilled - 2 * stride : refilled + 2 * stride,
                    static_cast<std::size_t>(stride));
    }
    dst.framerate.reverseDominance();
    return QvStatus::ok;
}

int qvframes::copySwitched(QvFrame& dst, const QvFrame& src) {
    QV_ASSERT(src.inited());
    if (&dst == &src) return copySwitched(dst, QvFrame(src));
    const int status = takeFormat(dst, src.four_cc(), src.width(), src.height());
    for (int p = 0; p < dst.planes(); ++p) {
        const int pairs = dst.height(p) / 2;
        copyPlaneRows(dst, src, p, pairs, {.dstStep = 2, .srcFirst = 1, .srcStep = 2});
        copyPlaneRows(dst, src, p, pairs, {.dstFirst = 1, .dstStep = 2, .srcStep = 2});
        copyPlaneRows(dst, src, p, dst.height(p) % 2, {.dstFirst = 2 * pairs, .srcFirst = 2 * pairs});
    }
    dst.copyMeta(src);
    dst.framerate.reverseDominance();
    return status;
}

int qvframes::interlace(QvFrame& dst, const QvFrame& first, const QvFrame& second) {
    if (!checkFields(first, second)) return QvStatus::failed;
    if (&dst == &first) return interlace(dst, QvFrame(first), second);
    if (&dst == &second) return interlace(dst, first, QvFrame(second));
    const int status = first.height() <= std::numeric_limits<int>::max() / 2
                           ? takeFormat(dst, first.four_cc(), first.width(), 2 * first.height())
                           : QvStatus::outOfMemory;
    if (status != QvStatus::ok) dst.destroy();
    if (dst.inited() && first.height() == 1) dst.setBlack();  // fields of one row bring no chroma
    for (int p = 0; p < dst.planes(); ++p) {
        const int rows = first.height(p);
        copyPlaneRows(dst, first, p, rows, {.dstStep = 2});
        copyPlaneRows(dst, second, p, rows, {.dstFirst = 1, .dstStep = 2});
        // Two odd heights make one more chroma row than the fields have.
        if (dst.height(p) > 2 * rows && rows > 0)
            copyPlaneRows(dst, dst, p, 1, {.dstFirst = 2 * rows, .srcFirst = 2 * rows - 2});
    }
    dst.copyMeta(first);
    dst.framerate.setInterlaced(2);
    return status;
}

int qvframes::combineFields(QvFrame& dst, const QvFrame& first, const QvFrame& second) {
    if (!checkFields(first, second)) return QvStatus::failed;
    if (&dst == &first) return combineFields(dst, QvFrame(first), second);
    if (&dst == &second) return combineFields(dst, first, QvFrame(second));
    const int status = takeFormat(dst, first.four_cc(), first.width(), first.height());
    for (int p = 0; p < dst.planes(); ++p) {
        const int rows = dst.height(p);
        copyPlaneRows(dst, first, p, (rows + 1) / 2, {.dstStep = 2, .srcStep = 2});
        copyPlaneRows(dst, second, p, rows / 2, {.dstFirst = 1, .dstStep = 2, .srcFirst = 1, .srcStep = 2});
    }
    dst.copyMeta(first);
    dst.framerate.setInterlaced(0);
    return status;
}

int qvframes::copyDeinterlaced(QvFrame& dst, const QvFrame& src, bool firstField) {
    QV_ASSERT(src.inited());
    if (&dst == &src) return copyDeinterlaced(dst, QvFrame(src), firstField);
    const int status = takeFormat(dst, src.four_cc(), src.width(), halfHeight(src));
    for (int p = 0; p < dst.planes(); ++p)
        copyPlaneRows(dst, src, p, dst.height(p), {.srcFirst = firstField ? 0 : 1, .srcStep = 2});
    dst.copyMeta(src);
    dst.framerate.setInterlaced(0);
    return status;
}

int qvframes::copyBob(QvFrame& dst, const QvFrame& src) {
    QV_ASSERT(src.inited());
    if (&dst == &src) return copyBob(dst, QvFrame(src));
    const int status = takeFormat(dst, src.four_cc(), src.width(), halfHeight(src));
    for (int p = 0; p < dst.planes(); ++p) {
        const auto average = hasWords(src) ? qvpixels::averageWords : qvpixels::averageBytes;
        const std::size_t unit = hasWords(src) ? 2 : 1;
        const auto count = static_cast<std::size_t>(rowBytes(dst, src, p)) / unit;
        const std::ptrdiff_t srcStride = src.stride(p);
        const std::ptrdiff_t dstStride = dst.stride(p);
        const unsigned char* upper = src.plane(p);
        unsigned char* to = dst.plane(p);
        for (int row = dst.height(p); row > 0; --row, upper += 2 * srcStride, to += dstStride)
            average(to, upper, upper + srcStride, count);
    }
    dst.copyMeta(src);
    dst.framerate.setInterlaced(0);
    return status;
}
