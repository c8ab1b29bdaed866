#include "builtin/video/fields.h"

#include <algorithm>

#include "core/engine/qvlog.h"
#include "core/engine/status.h"
#include "core/media/qvframe.h"
#include "core/media/rows_p.h"

namespace {

bool sameShape(const QvFrame& a, const QvFrame& b) {
    return a.inited() && b.inited() && a.four_cc() == b.four_cc() && a.width() == b.width() &&
           a.height() == b.height();
}

void copyField(QvFrame& to, const QvFrame& from, Field field) {
    const std::ptrdiff_t first = field == Field::top ? 0 : 1;
    for (int p = 0; p < to.planes(); ++p) {
        const std::ptrdiff_t toStride = to.stride(p), fromStride = from.stride(p);
        if (toStride <= 0 || fromStride <= 0) continue;
        const int rows = std::min(to.plane_bytes(p) / to.stride(p), from.plane_bytes(p) / from.stride(p));
        qvrows::copy(to.plane(p) + first * toStride, 2 * toStride, from.plane(p) + first * fromStride,
                     2 * fromStride, std::min(toStride, fromStride), (rows + (first == 0 ? 1 : 0)) / 2);
    }
}

}  // namespace

int beginWeave(QvFrame& to, const QvFrame& from, Field field) {
    if (!sameShape(to, from)) {
        const int status = to.init(from.four_cc(), from.width(), from.height());
        if (status != QvStatus::ok) return status;
    }
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
