// Copies of whole pictures, row by row, and of their fields.
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/pixelkernels_p.h"
#include "core/media/qvframe.h"
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

}  // namespace

int QvFrame::copy(const QvFrame& src, bool flip) {
    if (this == &src) return flip ? copy(QvFrame(src), true) : QvStatus::ok;
    if (!src.inited_) destroy();
    const int status = src.inited_ ? takeFormat(src.four_cc(), src.width(), src.height()) : QvStatus::ok;
    for (int p = 0; p < planes_; ++p) {
        const int rows = height(p);
        copyPlaneRows(*this, src, p, rows, flip ? RowWalk{.dstFirst = rows - 1, .dstStep = -1} : RowWalk{});
    }
    copyMeta(src);
    if (flip) framerate.reverseDominance();
    return status;
}

void QvFrame::copyMeta(const QvFrame& src) { _copyMeta(src, nullptr); }

// Entry by entry: those that are there already take the new values without a new place in memory.
void QvFrame::_copyMeta(const QvFrame& src, const char* kept) {
    framerate = src.framerate;
    frameNr = src.frameNr;
    if (&src == this) return;
    for (int i = meta_.size() - 1; i >= 0; --i) {
        const char* key = meta_.getKey(i);
        if (!src.meta_.isSet(key) && !(kept && std::strcmp(key, kept) == 0)) meta_.remove(key);
    }
    for (auto [key, value] : src.meta_)
        if (!(kept && std::strcmp(key, kept) == 0)) meta_.set(key, *value);
}

int QvFrame::copyFramett(const frame_tt& tt, bool keepStrides) {
    if (&tt == &tt_) return QvStatus::ok;
    const frame_tt from = tt;
    if (!inited_ || !sameFormat(from.four_cc, from.width, from.height)) {
        const AnyVector strides(from.strides[0], from.strides[1], from.strides[2]);
        const int status =
            init(from.four_cc, from.width, from.height, nullptr, keepStrides ? &strides : nullptr);
        if (status != QvStatus::ok) return status;
    }
    for (int p = 0; p < planes_; ++p) {
        QV_ASSERT(from.planes[p] != nullptr || planeBytes_[p] == 0);
        const long long theirs = std::llabs(static_cast<long long>(from.strides[p]));
        qvrows::copy(tt_.planes[p], tt_.strides[p], from.planes[p], from.strides[p],
                     static_cast<std::ptrdiff_t>(std::min<long long>(tt_.strides[p], theirs)), height(p));
    }
    return QvStatus::ok;
}

int QvFrame::copyShifted(const QvFrame& src) {
    QV_ASSERT(src.inited_);
    if (this == &src) return copyShifted(QvFrame(src));
    const int status = takeFormat(src.four_cc(), src.width(), src.height());
    for (int p = 0; p < planes_; ++p) {
        const int rows = height(p);
        copyPlaneRows(*this, src, p, rows - 1, {.srcFirst = 1});
        // Below three rows there is no row of the same field to repeat.
        if (rows >= 3)
            copyPlaneRows(*this, *this, p, 1, {.dstFirst = rows - 1, .srcFirst = rows - 3});
        else
            copyPlaneRows(*this, src, p, std::min(rows, 1), {.dstFirst = rows - 1, .srcFirst = rows - 1});
    }
    copyMeta(src);
    framerate.reverseDominance();
    return status;
}

int QvFrame::changeDominance(bool up) {
    QV_ASSERT(inited_);
    for (int p = 0; p < planes_; ++p) {
        const std::ptrdiff_t stride = tt_.strides[p];
        const std::ptrdiff_t rows = stride > 0 ? planeBytes_[p] / stride : 0;
        if (rows < 2) continue;
        unsigned char* first = tt_.planes[p];
        const auto moved = static_cast<std::size_t>((rows - 1) * stride);
        std::memmove(up ? first : first + stride, up ? first + stride : first, moved);
        if (rows < 3) continue;
        unsigned char* refilled = up ? first + (rows - 1) * stride : first;
        std::memcpy(refilled, up ? refilled - 2 * stride : refilled + 2 * stride,
                    static_cast<std::size_t>(stride));
    }
    framerate.reverseDominance();
    return QvStatus::ok;
}

int QvFrame::copySwitched(const QvFrame& src) {
    QV_ASSERT(src.inited_);
    if (this == &src) return copySwitched(QvFrame(src));
    const int status = takeFormat(src.four_cc(), src.width(), src.height());
    for (int p = 0; p < planes_; ++p) {
        const int pairs = height(p) / 2;
        copyPlaneRows(*this, src, p, pairs, {.dstStep = 2, .srcFirst = 1, .srcStep = 2});
        copyPlaneRows(*this, src, p, pairs, {.dstFirst = 1, .dstStep = 2, .srcStep = 2});
        copyPlaneRows(*this, src, p, height(p) % 2, {.dstFirst = 2 * pairs, .srcFirst = 2 * pairs});
    }
    copyMeta(src);
    framerate.reverseDominance();
    return status;
}

int QvFrame::interlace(const QvFrame& first, const QvFrame& second) {
    if (!checkFields(first, second)) return QvStatus::failed;
    if (this == &first) return interlace(QvFrame(first), second);
    if (this == &second) return interlace(first, QvFrame(second));
    const int status = first.height() <= std::numeric_limits<int>::max() / 2
                           ? takeFormat(first.four_cc(), first.width(), 2 * first.height())
                           : QvStatus::outOfMemory;
    if (status != QvStatus::ok) destroy();
    if (inited_ && first.height() == 1) setBlack();  // fields of one row bring no chroma
    for (int p = 0; p < planes_; ++p) {
        const int rows = first.height(p);
        copyPlaneRows(*this, first, p, rows, {.dstStep = 2});
        copyPlaneRows(*this, second, p, rows, {.dstFirst = 1, .dstStep = 2});
        // Two odd heights make one more chroma row than the fields have.
        if (height(p) > 2 * rows && rows > 0)
            copyPlaneRows(*this, *this, p, 1, {.dstFirst = 2 * rows, .srcFirst = 2 * rows - 2});
    }
    copyMeta(first);
    framerate.setInterlaced(2);
    return status;
}

int QvFrame::combineFields(const QvFrame& first, const QvFrame& second) {
    if (!checkFields(first, second)) return QvStatus::failed;
    if (this == &first) return combineFields(QvFrame(first), second);
    if (this == &second) return combineFields(first, QvFrame(second));
    const int status = takeFormat(first.four_cc(), first.width(), first.height());
    for (int p = 0; p < planes_; ++p) {
        const int rows = height(p);
        copyPlaneRows(*this, first, p, (rows + 1) / 2, {.dstStep = 2, .srcStep = 2});
        copyPlaneRows(*this, second, p, rows / 2, {.dstFirst = 1, .dstStep = 2, .srcFirst = 1, .srcStep = 2});
    }
    copyMeta(first);
    framerate.setInterlaced(0);
    return status;
}

int QvFrame::copyDeinterlaced(const QvFrame& src, bool firstField) {
    QV_ASSERT(src.inited_);
    if (this == &src) return copyDeinterlaced(QvFrame(src), firstField);
    const int status = takeFormat(src.four_cc(), src.width(), halfHeight(src));
    for (int p = 0; p < planes_; ++p)
        copyPlaneRows(*this, src, p, height(p), {.srcFirst = firstField ? 0 : 1, .srcStep = 2});
    copyMeta(src);
    framerate.setInterlaced(0);
    return status;
}

int QvFrame::copyBob(const QvFrame& src) {
    QV_ASSERT(src.inited_);
    if (this == &src) return copyBob(QvFrame(src));
    const int status = takeFormat(src.four_cc(), src.width(), halfHeight(src));
    for (int p = 0; p < planes_; ++p) {
        const auto average = hasWords(src) ? qvpixels::averageWords : qvpixels::averageBytes;
        const std::size_t unit = hasWords(src) ? 2 : 1;
        const auto count = static_cast<std::size_t>(rowBytes(*this, src, p)) / unit;
        const std::ptrdiff_t srcStride = src.stride(p);
        for (int row = 0; row < height(p); ++row) {
            const unsigned char* upper = src.plane(p) + 2 * row * srcStride;
            average(tt_.planes[p] + static_cast<std::ptrdiff_t>(row) * tt_.strides[p], upper,
                    upper + srcStride, count);
        }
    }
    copyMeta(src);
    framerate.setInterlaced(0);
    return status;
}
