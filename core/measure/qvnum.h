// Comparison of numbers within a tolerance, and rational approximation.
#pragma once

#include "core/arch/api.h"

class QV_API QvNum {
  public:
    // True when |a - b| lies strictly below the tolerance; false if any of the three is NaN.
    static bool equ(double a, double b, double tolerance);

    // The fraction with the smallest denominator, from 1 up to but not including maxDen, for which num lies
    // within the tolerance (strictly) of den * value. 0; or -1, with both set to -1, if there is none, maxDen
    // is below 2, or num would not fit.
    static int ratio(double value, int& num, int& den, int maxDen, double tolerance);
};
