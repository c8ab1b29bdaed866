#include "core/engine/qvutil.h"

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "core/engine/qvnum.h"

float QvUtil::clip(float value, float low, float high) { return std::min(std::max(value, low), high); }

bool QvUtil::equ(double a, double b, double tolerance) { return QvNum::equ(a, b, tolerance); }

int QvUtil::ratio(double value, int& num, int& den, int maxDen, double tolerance) {
    return QvNum::ratio(value, num, den, maxDen, tolerance);
}

int QvUtil::findClosestDouble(const AnyVector& values, double value, double* nearest) {
    int best = -1;
    double bestDistance = 0;
    for (int i = 0; i < values.size(); ++i) {
        const Any& element = values.at(i);
        if (!element.isInt() && !element.isFloat()) continue;
        const double number = element.toDouble();
        const double distance = std::fabs(number - value);
        if (std::isnan(distance) || (best >= 0 && distance >= bestDistance)) continue;
        best = i;
        bestDistance = distance;
        if (nearest) *nearest = number;
    }
    return best;
}

AnyDict QvUtil::channelDesc(int channels, bool named) {
    Any name = Any::sprintf("%d channels", channels);
    if (channels == 1) name = named ? "mono" : "1 channel";
    if (channels == 2 && named) name = "stereo";
    return AnyDict("value", channels, "name", name);
}
