#include "core/measure/rect.h"

#include "core/measure/exactmath_p.h"

namespace {

QvPoint sum(const QvPoint& a, const QvPoint& b) {
    return {qvmath::wrapAdd(a.x(), b.x()), qvmath::wrapAdd(a.y(), b.y())};
}

}  // namespace

int QvRect::width() const { return qvmath::wrapSub(right(), left()); }

int QvRect::height() const { return qvmath::wrapSub(bottom(), top()); }

void QvRect::setWidth(int width) { setRight(qvmath::wrapAdd(left(), width)); }

void QvRect::setHeight(int height) { setBottom(qvmath::wrapAdd(top(), height)); }

bool QvRect::contains(const QvRect& inner) const {
    return inner.left() >= left() && inner.right() <= right() && inner.top() >= top() &&
           inner.bottom() <= bottom();
}

void QvRect::move(const QvPoint& by) {
    topLeft_ = sum(topLeft_, by);
    bottomRight_ = sum(bottomRight_, by);
}

void QvRect::moveTo(const QvPoint& to) {
    const QvPoint size(width(), height());
    topLeft_ = to;
    bottomRight_ = sum(to, size);
}
