#include "core/measure/mediatime.h"

#include "core/arch/qvassert.h"
#include "core/measure/datetime.h"
#include "core/measure/exactmath_p.h"
#include "core/measure/qvframerate.h"
#include "core/measure/timecode.h"

namespace {

void checkTimescale(long long timescale) { QV_ASSERT_MSG(timescale >= 1, "MediaTime: invalid timescale"); }

}  // namespace

MediaTime::MediaTime(long long position, const QvRatio& rate, long long timescale) {
    QV_ASSERT(timescale >= 1);
    setPosition(position, rate, timescale);
}

MediaTime::MediaTime(long long position, const QvFramerate& rate, long long timescale) {
    checkTimescale(timescale);
    setPosition(position, rate.rate(), timescale);
}

MediaTime::MediaTime(const QvTime& time, long long timescale) { setSeconds(time.toSecDbl(), timescale); }

void MediaTime::set(long long value, long long timescale) {
    checkTimescale(timescale);
    timescale_ = timescale;
    value_ = value;
}

void MediaTime::setSeconds(double seconds, long long timescale) {
    set(qvmath::truncTo<long long>(static_cast<double>(timescale) * seconds + 0.5), timescale);
}

void MediaTime::setPosition(long long position, int perSecond, long long timescale) {
    checkTimescale(timescale);
    setPosition(position, QvRatio(perSecond, 1), timescale);
}

void MediaTime::setPosition(long long position, const QvRatio& rate, long long timescale) {
    long long ticks = timescale;
    long long frames = rate.num;
    QvRatio::reduce64(ticks, frames);
    QV_ASSERT(frames != 0);
    value_ = qvmath::mulDiv(rate.den, ticks, position, frames);
    timescale_ = timescale;
}

long long MediaTime::position(const QvRatio& rate) const {
    long long frames = rate.num;
    long long ticks = timescale_;
    QvRatio::reduce64(frames, ticks);
    QV_ASSERT(rate.den != 0);
    return qvmath::mulDiv(frames, value_, 1, static_cast<qvmath::Wide>(rate.den) * ticks);
}

long long MediaTime::position(const QvFramerate& rate) const { return position(rate.rate()); }

long long MediaTime::positionAt(int perSecond) const { return position(QvRatio(perSecond, 1)); }

long long MediaTime::ms() const { return qvmath::truncTo<long long>(seconds() * 1000.0 + 0.5); }

QvTime MediaTime::time() const {
    const long long wholeSeconds = value_ / timescale_;
    const long long rest = value_ % timescale_;
    const long long ms = qvmath::mulDiv(rest, 1000, 1, timescale_);
    const long long fraction = rest - qvmath::mulDiv(timescale_, ms, 1, 1000);
    return {static_cast<int>(wholeSeconds / 3600), static_cast<int>(wholeSeconds / 60 % 60),
            static_cast<int>(wholeSeconds % 60), static_cast<int>(ms),
            static_cast<int>(qvmath::mulDiv(fraction, 1000000, 1, timescale_))};
}

QvTimecode MediaTime::timecode(const QvFramerate& rate) const {
    return {static_cast<int>(position(rate)), rate, false};
}

bool MediaTime::operator<(const MediaTime& other) const {
    QV_ASSERT(timescale_ == other.timescale_);
    return value_ < other.value_;
}

bool MediaTime::operator<=(const MediaTime& other) const {
    QV_ASSERT(timescale_ == other.timescale_);
    return value_ <= other.value_;
}

bool MediaTime::operator>(const MediaTime& other) const { return other < *this; }

bool MediaTime::operator>=(const MediaTime& other) const { return other <= *this; }

MediaTime operator+(const MediaTime& a, const MediaTime& b) {
    QV_ASSERT(a.timescale() == b.timescale());
    return MediaTime(qvmath::saturate(static_cast<qvmath::Wide>(a.value()) + b.value()), a.timescale());
}

MediaTime operator-(const MediaTime& a, const MediaTime& b) {
    QV_ASSERT(a.timescale() == b.timescale());
    return MediaTime(qvmath::saturate(static_cast<qvmath::Wide>(a.value()) - b.value()), a.timescale());
}
