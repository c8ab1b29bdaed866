#include "core/measure/qvnum.h"

#include <cmath>
#include <initializer_list>
#include <limits>

bool QvNum::equ(double a, double b, double tolerance) { return tolerance > std::fabs(a - b); }

int QvNum::ratio(double value, int& num, int& den, int maxDen, double tolerance) {
    constexpr double most = std::numeric_limits<int>::max() - 1.0;
    for (int d = 1; d < maxDen; ++d) {
        const double x = d * value;
        if (!(std::fabs(x) < most)) break;  // grows with d; NaN ends here too
        for (const double candidate : {std::trunc(x + 0.5), std::trunc(x), std::trunc(x + 1.0)}) {
            if (!equ(candidate, x, tolerance)) continue;
            num = static_cast<int>(candidate);
            den = d;
            return 0;
        }
    }
    num = den = -1;
    return -1;
}
