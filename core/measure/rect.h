// Integer points and rectangles. Sums wrap at 32 bits.
#pragma once

#include "core/arch/api.h"

class QV_API QvPoint {
  public:
    constexpr QvPoint() = default;
    constexpr QvPoint(int x, int y) : x_(x), y_(y) {}

    constexpr int x() const { return x_; }
    constexpr int y() const { return y_; }
    void setX(int x) { x_ = x; }
    void setY(int y) { y_ = y; }

    constexpr bool operator==(const QvPoint&) const = default;

  private:
    int x_ = 0;
    int y_ = 0;
};

// Half open: columns left .. right - 1 and rows top .. bottom - 1.
class QV_API QvRect {
  public:
    constexpr QvRect() = default;
    constexpr QvRect(int left, int top, int right, int bottom)
        : topLeft_(left, top), bottomRight_(right, bottom) {}
    constexpr QvRect(const QvPoint& topLeft, const QvPoint& bottomRight)
        : topLeft_(topLeft), bottomRight_(bottomRight) {}

    int left() const { return topLeft_.x(); }
    int top() const { return topLeft_.y(); }
    int right() const { return bottomRight_.x(); }
    int bottom() const { return bottomRight_.y(); }
    int width() const;
    int height() const;
    const QvPoint& topLeft() const { return topLeft_; }
    const QvPoint& bottomRight() const { return bottomRight_; }

    void setLeft(int left) { topLeft_.setX(left); }
    void setTop(int top) { topLeft_.setY(top); }
    void setRight(int right) { bottomRight_.setX(right); }
    void setBottom(int bottom) { bottomRight_.setY(bottom); }
    void setTopLeft(const QvPoint& point) { topLeft_ = point; }
    void setBottomRight(const QvPoint& point) { bottomRight_ = point; }
    void setWidth(int width);    // moves the right side
    void setHeight(int height);  // moves the bottom

    bool contains(const QvRect& inner) const;
    void move(const QvPoint& by);    // shifts all sides
    void moveTo(const QvPoint& to);  // puts the top left corner there and keeps the size

    constexpr bool operator==(const QvRect&) const = default;

  private:
    QvPoint topLeft_;
    QvPoint bottomRight_;
};
