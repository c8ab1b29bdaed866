// Arithmetic that stays defined outside the range of its result.
#pragma once

#include <cmath>
#include <limits>

namespace qvmath {

// Truncates toward zero. What does not fit (NaN too) becomes the lowest value, as on the hardware.
template <class To>
To truncTo(double value) {
    constexpr double limit = -static_cast<double>(std::numeric_limits<To>::min());
    if (!(value > -limit - 1.0 && value < limit)) return std::numeric_limits<To>::min();
    return static_cast<To>(value);
}

__extension__ typedef __int128 Wide;

inline long long saturate(Wide value) {
    constexpr Wide low = std::numeric_limits<long long>::min();
    constexpr Wide high = std::numeric_limits<long long>::max();
    return static_cast<long long>(value < low ? low : value > high ? high : value);
}

// a * b * c / divisor with an exact product, truncated; a result beyond 64 bits saturates.
inline long long mulDiv(long long a, long long b, long long c, Wide divisor) {
    long long ab = 0;
    long long abc = 0;
    constexpr Wide high = std::numeric_limits<long long>::max();
    if (!__builtin_mul_overflow(a, b, &ab) && !__builtin_mul_overflow(ab, c, &abc) && divisor > 0 &&
        divisor <= high)
        return abc / static_cast<long long>(divisor);
    Wide product = 0;
    const bool overflow = __builtin_mul_overflow(static_cast<Wide>(a) * b, static_cast<Wide>(c), &product);
    const bool negative = ((a < 0) != (b < 0)) != ((c < 0) != (divisor < 0));
    if (overflow)
        return negative ? std::numeric_limits<long long>::min() : std::numeric_limits<long long>::max();
    return saturate(product / divisor);
}

// Sums and differences that wrap at 32 bits.
inline int wrapAdd(int a, int b) {
    return static_cast<int>(static_cast<unsigned>(a) + static_cast<unsigned>(b));
}
inline int wrapSub(int a, int b) {
    return static_cast<int>(static_cast<unsigned>(a) - static_cast<unsigned>(b));
}
inline int wrapMul(int a, int b) {
    return static_cast<int>(static_cast<unsigned>(a) * static_cast<unsigned>(b));
}

}  // namespace qvmath
