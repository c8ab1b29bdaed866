#include "core/engine/qvutil.h"

#include <algorithm>
#include <cmath>
#include <cstdio>

#include "core/measure/clocktime_p.h"
#include "core/measure/fourcc.h"
#include "core/measure/pictureaspect_p.h"
#include "core/measure/qvframerate.h"
#include "core/measure/qvnum.h"

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

bool QvUtil::equalFcc(unsigned a, unsigned b) { return qvEqualFourcc(a, b); }

bool QvUtil::exchengeableFOURCC(int a, int b) {
    return qvExchangeableFourcc(static_cast<unsigned>(a), static_cast<unsigned>(b));
}

int QvUtil::macroblocks(int width, int height) {
    if (width <= 0 || height <= 0) return 0;
    const long long count = ((width + 15LL) / 16) * ((height + 15LL) / 16);
    return static_cast<int>(std::min<long long>(count, 0x7FFFFFFF));
}

int QvUtil::getPixelAspect(int* x, int* y, double frameAspect, int width, int height, bool broadcast) {
    return qvPixelAspect(*x, *y, frameAspect, width, height, broadcast);
}

double QvUtil::getFrameAspect(int x, int y, int width, int height, bool broadcast) {
    return qvFrameAspect(x, y, width, height, broadcast);
}

long long QvUtil::pts2FrameNr(long long pts, double rate, bool) { return qvFrameAtPts(pts, rate); }

long long QvUtil::samplesForFrames(int frames, const QvFramerate& rate, int samplerate) {
    return qvSamplesForFrames(frames, rate, samplerate);
}

void QvUtil::sec2hms(double seconds, int& h, int& m, int& s) { qvClockTime(seconds, h, m, s); }

void QvUtil::msec2hmsmsec(long long milliseconds, int& h, int& m, int& s, int& ms) {
    qvClockTimeMs(milliseconds, h, m, s, ms);
}

void QvUtil::printPos(char* buffer, long long milliseconds) {
    int h, m, s, ms;
    qvClockTimeMs(milliseconds, h, m, s, ms);
    std::snprintf(buffer, posSize, "%d:%2.2d:%2.2d:%3.3d", h, m, s, ms);
}
