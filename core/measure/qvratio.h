// Exact ratios, and the way from a double to one.
#pragma once

#include "core/arch/api.h"
#include "core/measure/qvnum.h"

// num / den. Any signs are allowed; a zero denominator reads as the double 0.0.
class QV_API QvRatio {
  public:
    // Rates agree when they are closer than this: 1e-4 in single precision.
    static constexpr double tolerance = 9.999999747378752e-5;

    int num = 24;
    int den = 1;

    constexpr QvRatio() = default;
    constexpr QvRatio(int numerator, int denominator) : num(numerator), den(denominator) {}
    explicit constexpr QvRatio(const int (&pair)[2]) : num(pair[0]), den(pair[1]) {}

    constexpr double ratio() const { return den == 0 ? 0.0 : static_cast<double>(num) / den; }
    constexpr operator double() const { return ratio(); }

    // Field by field: 50/2 is not 25/1.
    constexpr bool operator==(const QvRatio& other) const { return num == other.num && den == other.den; }
    constexpr bool operator!=(const QvRatio& other) const { return !(*this == other); }

    // Greatest common divisor, or 0 if a member is below 1.
    int gcd() const;
    // Divides both members by gcd(); a ratio with a member below 1 is unchanged.
    void reduce();

    // Of the absolute values; 0 if one of them is 0. The divisor of two INT64_MIN is INT64_MIN.
    static long long gcd64(long long a, long long b);
    // Divides both by their gcd64 and keeps their signs; nothing happens if one of them is 0.
    static void reduce64(long long& a, long long& b);

    // The ratio nearest to a rate, with the three NTSC rates recognised by name (within 1e-4), otherwise to
    // 1e-5, at last to three decimals. 0, or -1 with -1/-1 if no denominator below maxDen fits.
    int fromDouble(double value, int maxDen);

    // Rescales a count from one rate to another: value * from.num * to.den / (from.den * to.num), truncated.
    // The divisor is a 32-bit product, and wraps as one. A divisor of zero is an assertion.
    static long long multyplyByRatio(long long value, const QvRatio& from, const QvRatio& to);
};
