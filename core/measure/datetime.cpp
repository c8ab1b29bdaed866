#include "core/measure/datetime.h"

#include <cstdio>
#include <tuple>

namespace {

// Widths of the packed fields below the year, from the high end.
constexpr int monthBits = 4, dayBits = 5, hourBits = 5, minuteBits = 6, secondBits = 6, fractionBits = 10;

void push(unsigned long long& packed, int field, int bits) {
    packed = packed << bits | (static_cast<unsigned>(field) & ((1U << bits) - 1));
}

int pop(long long& packed, int bits) {
    const auto field = static_cast<int>(packed & ((1LL << bits) - 1));
    packed >>= bits;
    return field;
}

}  // namespace

double QvTime::toSecDbl() const { return hours * 3600.0 + minutes * 60.0 + seconds + milliseconds / 1000.0; }

void QvTime::pprint(char* dst) const {
    std::snprintf(dst, textSize, "%.2d:%.2d:%.2d:%.3d", hours, minutes, seconds, milliseconds);
}

bool QvTime::operator<(const QvTime& other) const {
    return std::tie(hours, minutes, seconds, milliseconds, microseconds) <
           std::tie(other.hours, other.minutes, other.seconds, other.milliseconds, other.microseconds);
}

bool QvDate::operator<(const QvDate& other) const {
    return std::tie(year, month, day) < std::tie(other.year, other.month, other.day);
}

long long QvDateTime::toI64() const {
    auto packed = static_cast<unsigned long long>(date.year);
    push(packed, date.month, monthBits);
    push(packed, date.day, dayBits);
    push(packed, time.hours, hourBits);
    push(packed, time.minutes, minuteBits);
    push(packed, time.seconds, secondBits);
    push(packed, time.milliseconds, fractionBits);
    push(packed, time.microseconds, fractionBits);
    return static_cast<long long>(packed);
}

void QvDateTime::fromI64(long long packed) {
    time.microseconds = pop(packed, fractionBits);
    time.milliseconds = pop(packed, fractionBits);
    time.seconds = pop(packed, secondBits);
    time.minutes = pop(packed, minuteBits);
    time.hours = pop(packed, hourBits);
    date.day = pop(packed, dayBits);
    date.month = pop(packed, monthBits);
    date.year = static_cast<int>(packed);
}
