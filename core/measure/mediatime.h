// An instant, counted in ticks of a timescale.
#pragma once

#include <concepts>

#include "core/arch/api.h"

class QvFramerate;
class QvRatio;
class QvTime;
class QvTimecode;

// All divisions truncate toward zero; products are exact, also beyond 64 bits. A timescale below 1 is the
// assertion "MediaTime: invalid timescale"; a rate of zero is an assertion, too.
class QV_API MediaTime {
  public:
    // Ticks a second on which every link, decoder and in or out point can meet: a multiple of 24, 25, 30,
    // 48000 and 44100, in which the NTSC rates are exact as well.
    static constexpr long long defaultTimescale = 35280000;

    MediaTime() = default;  // 0 at the default timescale

    // Ticks.
    template <std::integral V>
    explicit MediaTime(V value, long long timescale = defaultTimescale) {
        set(static_cast<long long>(value), timescale);
    }
    // Seconds, rounded to a tick.
    template <std::floating_point V>
    explicit MediaTime(V seconds, long long timescale = defaultTimescale) {
        setSeconds(static_cast<double>(seconds), timescale);
    }
    // The start of frame (or sample) number `position` at a rate.
    MediaTime(long long position, const QvRatio& rate, long long timescale);
    MediaTime(long long position, const QvFramerate& rate, long long timescale);
    template <std::integral R>
    MediaTime(long long position, R perSecond, long long timescale) {
        setPosition(position, static_cast<int>(perSecond), timescale);
    }
    // A clock time, without its microseconds, rounded to a tick.
    explicit MediaTime(const QvTime& time, long long timescale = defaultTimescale);

    void set(long long value, long long timescale);

    long long value() const { return value_; }
    long long timescale() const { return timescale_; }

    // Number of the frame (or sample) that this instant lies in.
    long long position(const QvRatio& rate) const;
    long long position(const QvFramerate& rate) const;
    template <std::integral R>
    long long position(R perSecond) const {
        return positionAt(static_cast<int>(perSecond));
    }

    double seconds() const { return static_cast<double>(value_) / static_cast<double>(timescale_); }
    double toDouble() const { return seconds(); }
    long long ms() const;
    QvTime time() const;
    QvTimecode timecode(const QvFramerate& rate) const;

    // Different timescales: == is false, even for the same instant; < <= > >= + - are an assertion.
    bool operator==(const MediaTime& other) const = default;
    bool operator<(const MediaTime& other) const;
    bool operator<=(const MediaTime& other) const;
    bool operator>(const MediaTime& other) const;
    bool operator>=(const MediaTime& other) const;

  private:
    long long timescale_ = defaultTimescale;
    long long value_ = 0;

    void setSeconds(double seconds, long long timescale);
    void setPosition(long long position, int perSecond, long long timescale);
    void setPosition(long long position, const QvRatio& rate, long long timescale);
    long long positionAt(int perSecond) const;
};

QV_API MediaTime operator+(const MediaTime& a, const MediaTime& b);
QV_API MediaTime operator-(const MediaTime& a, const MediaTime& b);
