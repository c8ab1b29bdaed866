#include "builtin/sound/effects/levelcurve.h"

#include <algorithm>
#include <utility>

LevelCurve::LevelCurve(std::vector<Point> points) : points_(std::move(points)) {
    std::stable_sort(points_.begin(), points_.end(),
                     [](const Point& a, const Point& b) { return a.time < b.time; });
}

LevelCurve::Walk::Walk(const LevelCurve& curve, double from)
    : begin_(curve.points_.data()), end_(begin_ + curve.points_.size()) {
    next_ = std::upper_bound(begin_, end_, from,
                             [](double time, const Point& point) { return time < point.time; });
}

double LevelCurve::Walk::at(double time) {
    while (next_ != end_ && !(next_->time > time)) ++next_;
    if (next_ == end_) return begin_ == end_ ? whole : end_[-1].volume;
    const Point last = next_ == begin_ ? Point() : next_[-1];
    return (next_->volume - static_cast<double>(last.volume)) * (time - last.time) /
               (next_->time - last.time) +
           last.volume;
}
