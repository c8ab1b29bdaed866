#include "builtin/video/frames/fields.h"

#include <algorithm>

#include "core/engine/log/qvlog.h"
#include "core/engine/status.h"
#include "core/media/qvframe.h"
#include "core/media/rows_p.h"

namespace {

void copyField(QvFrame& to, const QvFrame& from, Field field) {
    const int first = field == Field::top ? 0 : 1;
    for (int p = 0; p < to.planes(); ++p) {
        const RowShape shape = commonRows(to, from, p);
        const std::ptrdiff_t toStride = to.stride(p), fromStride = from.stride(p);
        qvrows::copy(to.plane(p) + first * toStride, 2 * toStride, from.plane(p) + first * fromStride,
                     2 * fromStride, shape.bytes, (shape.rows + 1 - first) / 2);
    }
}

int takeShape(QvFrame& to, const QvFrame& from) {
    return sameShape(to, from) ? QvStatus::ok : to.init(from.four_cc(), from.width(), from.height());
}

}  // namespace

bool sameShape(const QvFrame& a, const QvFrame& b) {
    return a.inited() && b.inited() && a.four_cc() == b.four_cc() && a.width() == b.width() &&
           a.height() == b.height();
}

RowShape commonRows(const QvFrame& a, const QvFrame& b, int plane) {
    const int strideA = a.stride(plane), strideB = b.stride(plane);
    if (strideA <= 0 || strideB <= 0) return {};
    return {std::min(strideA, strideB),
            std::min(a.plane_bytes(plane) / strideA, b.plane_bytes(plane) / strideB)};
}

int beginWeave(QvFrame& to, const QvFrame& from, Field field) {
    if (const int status = takeShape(to, from)) return status;
    copyField(to, from, field);
    to.copyMeta(from);
    return QvStatus::ok;
}

int endWeave(QvFrame& to, const QvFrame& from, Field field) {
    if (!sameShape(to, from)) {
        qv_dbg()->error("top and bottom fields different");
        return QvStatus::failed;
    }
    copyField(to, from, field);
    return QvStatus::ok;
}

int copyFields(QvFrame& to, const QvFrame& from) {
    if (const int status = takeShape(to, from)) return status;
    copyField(to, from, Field::top);
    copyField(to, from, Field::bottom);
    return QvStatus::ok;
}
