// Clock time and calendar date.
#pragma once

#include "core/arch/api.h"

class QV_API QvTime {
  public:
    int hours = 0;
    int minutes = 0;
    int seconds = 0;
    int milliseconds = 0;
    int microseconds = 0;

    static constexpr int textSize = 48;  // what pprint needs at most, with its terminating zero

    constexpr QvTime() = default;
    constexpr QvTime(int h, int m, int s, int ms = 0, int us = 0)
        : hours(h), minutes(m), seconds(s), milliseconds(ms), microseconds(us) {}

    double toSecDbl() const;       // without the microseconds
    void pprint(char* dst) const;  // "01:02:03:004"; dst holds at least textSize characters

    bool operator==(const QvTime&) const = default;
    bool operator<(const QvTime& other) const;
};

class QV_API QvDate {
  public:
    int day = 0;
    int month = 0;
    int year = 0;

    constexpr QvDate() = default;
    constexpr QvDate(int d, int m, int y) : day(d), month(m), year(y) {}

    bool operator==(const QvDate&) const = default;
    bool operator<(const QvDate& other) const;
};

class QV_API QvDateTime {
  public:
    QvDate date;
    QvTime time;

    constexpr QvDateTime() = default;
    constexpr QvDateTime(const QvDate& d, const QvTime& t) : date(d), time(t) {}

    bool operator==(const QvDateTime&) const = default;

    // One integer that compares in time order. From the low bit: microseconds 10 bits, milliseconds 10,
    // seconds 6, minutes 6, hours 5, day 5, month 4, year the rest. A field is cut to its bits.
    long long toI64() const;
    void fromI64(long long packed);
};
