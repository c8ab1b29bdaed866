#include "core/measure/qvframerate.h"

#include <string>

#include "core/arch/formattext_p.h"
#include "core/measure/exactmath_p.h"
#include "core/measure/measuretext_p.h"

namespace {

constexpr int maxDenominator = 10000;
constexpr double truncationSlack = 1e-18;

enum Pulldown { none = 0, advanced32 = 3, doubling = 4 };

bool is32Pulldown(int pulldown) { return pulldown >= 1 && pulldown <= advanced32; }

bool closeRates(double a, double b) { return QvNum::equ(a, b, QvRatio::tolerance); }

bool integral(double value) {
    return closeRates(value, static_cast<double>(qvmath::truncTo<long long>(value + truncationSlack)));
}

// Two decimals unless fewer say the same.
std::string number(double rate) {
    if (integral(rate)) return qvShortText("%d", qvmath::truncTo<int>(rate + truncationSlack));
    if (!integral(rate * 10)) return qvShortText("%5.2f", rate);
    return rate < 10 ? qvShortText("%3.1f", rate) : qvShortText("%4.1f", rate);
}

QvRatio doubled(const QvRatio& rate) {
    QvRatio twice(qvmath::wrapMul(2, rate.num), rate.den);
    twice.reduce();
    return twice;
}

QvRatio fiveQuarters(const QvRatio& rate) { return {qvmath::wrapMul(rate.num, 5) / 4, rate.den}; }

QvFramerate named(int num, int den, int interlaced) { return QvFramerate(QvRatio(num, den), interlaced); }

// Progressive rates are named by frames, interlaced ones by fields.
bool isNamed(const QvFramerate& rate, double value, bool interlaced) {
    return closeRates(rate.rate(), value) && (rate.interlaced() != 0) == interlaced;
}

// Whether a and b, as the pulldown of two rates, are of one kind.
bool samePulldownKind(int a, int b) {
    return (a != none) == (b != none) && (a == advanced32) == (b == advanced32);
}

}  // namespace

QvFramerate::QvFramerate(const QvRatio& rate, int interlaced, bool df, int pulldown) {
    setAll(rate, interlaced, df, pulldown);
}

QvFramerate::QvFramerate(double rate, int interlaced, bool df, int pulldown) {
    setAll(rate, interlaced, df, pulldown);
}

void QvFramerate::setAll(const QvRatio& rate, int interlaced, bool df, int pulldown) {
    setRate(rate);
    interlaced_ = interlaced;
    df_ = df;
    pulldown_ = pulldown;
}

void QvFramerate::setAll(double rate, int interlaced, bool df, int pulldown) {
    setRate(rate);
    interlaced_ = interlaced;
    df_ = df;
    pulldown_ = pulldown;
}

void QvFramerate::setRate(const QvRatio& rate) {
    rate_ = rate;
    rate_.reduce();
}

void QvFramerate::setRate(double rate) {
    rate_.fromDouble(rate, maxDenominator);
    rate_.reduce();
}

QvRatio QvFramerate::displayRate() const {
    if (is32Pulldown(pulldown_)) return fiveQuarters(rate_);
    return pulldown_ == doubling ? doubled(rate_) : rate_;
}

void QvFramerate::reverseDominance() {
    if (interlaced_ != 0) interlaced_ = interlaced_ == 1 ? 2 : 1;
}

bool QvFramerate::isPAL() const {
    return closeRates(rate_, 25.0) || closeRates(rate_, 50.0) || closeRates(rate_, 12.5);
}

bool QvFramerate::operator==(const QvFramerate& other) const {
    return closeRates(rate_, other.rate_) && df_ == other.df_ && pulldown_ == other.pulldown_ &&
           interlaced_ == other.interlaced_;
}

std::string qvRateText(const QvFramerate& rate, bool showDf, bool showPulldown) {
    const int fields = rate.interlaced() != 0 ? 2 : 1;
    std::string text = number(rate.rate() * fields) + (rate.interlaced() != 0 ? "i" : "p");
    if (showDf && rate.df()) text += " DF";
    if (showPulldown && rate.pulldown() == doubling) {
        text += " -> " + number(fields * doubled(rate.rate()).ratio()) + "p PD";
    } else if (showPulldown && rate.pulldown() != none) {
        const QvRatio shown = is32Pulldown(rate.pulldown()) ? fiveQuarters(rate.rate()) : rate.rate();
        text += " -> " + number(fields * 2 * shown.ratio()) + "i PD";
        if (rate.pulldown() == advanced32) text += "(A)";
    }
    return text;
}

bool qvRateMatches(const QvFramerate& rate, const QvFramerate& other, bool exact, bool compareDf) {
    if (!closeRates(rate.rate(), other.rate())) return false;
    const bool dfMatters = compareDf && (rate.is23p() || rate.is29p() || rate.is59i() || rate.is59p());
    if (dfMatters && rate.df() != other.df()) return false;
    if (exact) return rate.interlaced() == other.interlaced() && rate.pulldown() == other.pulldown();
    return (rate.interlaced() != 0) == (other.interlaced() != 0) &&
           samePulldownKind(rate.pulldown(), other.pulldown());
}

#define QV_NAMED_RATE(name, num, den, scan, value)                                    \
    bool QvFramerate::is##name() const { return isNamed(*this, value, (scan) != 0); } \
    const QvFramerate& QvFramerate::f##name() {                                       \
        static const QvFramerate constant = named(num, den, scan);                    \
        return constant;                                                              \
    }

QV_NAMED_RATE(23p, 24000, 1001, 0, 23.976023976023978)
QV_NAMED_RATE(24p, 24, 1, 0, 24.0)
QV_NAMED_RATE(25p, 25, 1, 0, 25.0)
QV_NAMED_RATE(29p, 30000, 1001, 0, 29.97002997002997)
QV_NAMED_RATE(30p, 30, 1, 0, 30.0)
QV_NAMED_RATE(50p, 50, 1, 0, 50.0)
QV_NAMED_RATE(59p, 60000, 1001, 0, 59.94005994005994)
QV_NAMED_RATE(60p, 60, 1, 0, 60.0)
QV_NAMED_RATE(50i, 25, 1, 1, 25.0)
QV_NAMED_RATE(59i, 30000, 1001, 1, 29.97002997002997)
QV_NAMED_RATE(60i, 30, 1, 1, 30.0)
#undef QV_NAMED_RATE
