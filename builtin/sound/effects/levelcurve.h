// A level in percent that changes over time: straight lines between points, 100 percent at time 0 unless a
// point stands there, and the last point's level after the end.
#pragma once

#include <vector>

class LevelCurve {
  public:
    struct Point {
        double time = 0;   // seconds, finite
        int volume = 100;  // percent
    };
    static constexpr double whole = 100.0;  // of a curve without points

    LevelCurve() = default;
    explicit LevelCurve(std::vector<Point> points);  // in any order

    bool empty() const { return points_.empty(); }
    const std::vector<Point>& points() const { return points_; }  // by time

    // Reads a curve at times that never fall, without searching it again for each.
    class Walk {
      public:
        Walk() = default;
        Walk(const LevelCurve& curve, double from);
        double at(double time);  // percent
        // Whether no point lies ahead, so that the level stays what `at` gave last.
        bool atEnd() const { return next_ == end_; }

      private:
        const Point* begin_ = nullptr;
        const Point* next_ = nullptr;  // the first point after the time
        const Point* end_ = nullptr;
    };

  private:
    std::vector<Point> points_;
};
