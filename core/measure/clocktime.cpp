#include "core/measure/clocktime_p.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include "core/measure/qvframerate.h"
#include "core/measure/qvnum.h"

namespace {

using Wide = __int128;  // a product of two 64-bit numbers

long long narrowed(Wide value) {
    constexpr Wide least = std::numeric_limits<long long>::min(),
                   most = std::numeric_limits<long long>::max();
    return static_cast<long long>(std::clamp(value, least, most));
}

}  // namespace

long long qvFrameAtPts(long long pts, double rate) {
    constexpr int ticks = 27'000'000;
    int num = 0, den = 0;
    if (QvNum::ratio(rate, num, den, 10000, 0.001) != 0) return 0;
    return narrowed(static_cast<Wide>(num) * pts / (static_cast<Wide>(den) * ticks));
}

long long qvSamplesForFrames(int frames, const QvFramerate& rate, int samplerate) {
    const auto ratio = rate.rate();
    if (ratio.num == 0) return 0;
    return narrowed(static_cast<Wide>(frames) * samplerate * ratio.den / ratio.num);
}

void qvClockTime(double seconds, int& h, int& m, int& s) {
    constexpr double most = 1e12;
    int ms = 0;
    const double bounded = std::isnan(seconds) ? 0 : std::clamp(seconds, -most, most);
    qvClockTimeMs(static_cast<long long>(bounded) * 1000, h, m, s, ms);
}

void qvClockTimeMs(long long milliseconds, int& h, int& m, int& s, int& ms) {
    constexpr long long mostHours = std::numeric_limits<int>::max();
    ms = static_cast<int>(milliseconds % 1000);
    s = static_cast<int>(milliseconds / 1000 % 60);
    m = static_cast<int>(milliseconds / 60'000 % 60);
    h = static_cast<int>(std::clamp(milliseconds / 3'600'000, -mostHours, mostHours));
}
