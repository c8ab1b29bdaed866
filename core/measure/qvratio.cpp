#include "core/measure/qvratio.h"

#include <cmath>
#include <numeric>

#include "core/arch/qvassert.h"
#include "core/measure/exactmath_p.h"

namespace {

struct NamedRate {
    double value;
    QvRatio ratio;
};

constexpr NamedRate ntscRates[] = {
    {29.970029970029973, {30000, 1001}},
    {23.976023976023978, {24000, 1001}},
    {59.940059940059946, {60000, 1001}},
};

constexpr double ratioTolerance = 1.0e-5;

unsigned long long magnitude(long long value) {
    return value < 0 ? 0ULL - static_cast<unsigned long long>(value) : static_cast<unsigned long long>(value);
}

}  // namespace

int QvRatio::gcd() const { return num < 1 || den < 1 ? 0 : std::gcd(num, den); }

void QvRatio::reduce() {
    const int divisor = gcd();
    if (divisor <= 1) return;
    num /= divisor;
    den /= divisor;
}

long long QvRatio::gcd64(long long a, long long b) {
    if (a == 0 || b == 0) return 0;
    return static_cast<long long>(std::gcd(magnitude(a), magnitude(b)));
}

void QvRatio::reduce64(long long& a, long long& b) {
    const auto divisor = static_cast<unsigned long long>(gcd64(a, b));
    if (divisor <= 1) return;
    const auto divide = [divisor](long long value) {
        const unsigned long long quotient = magnitude(value) / divisor;
        return static_cast<long long>(value < 0 ? 0ULL - quotient : quotient);
    };
    a = divide(a);
    b = divide(b);
}

int QvRatio::fromDouble(double value, int maxDen) {
    for (const auto& named : ntscRates)
        if (QvNum::equ(value, named.value, tolerance)) {
            *this = named.ratio;
            return 0;
        }
    if (QvNum::ratio(value, num, den, maxDen, ratioTolerance) == 0) return 0;
    const double rounded = std::trunc(value * 1000.0 + 0.5) / 1000.0;
    return QvNum::ratio(rounded, num, den, maxDen, ratioTolerance);
}

long long QvRatio::multyplyByRatio(long long value, const QvRatio& from, const QvRatio& to) {
    if (from == to) return value;
    const long long divisor = qvmath::wrapMul(from.den, to.num);
    QV_ASSERT(divisor != 0);
    return qvmath::mulDiv(value, from.num, to.den, divisor);
}
