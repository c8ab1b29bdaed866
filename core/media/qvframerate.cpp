#include "core/media/qvframerate.h"

#include <string>

#include "core/media/exactmath_p.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

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
    if (integral(rate)) return Any::sprintf("%d", qvmath::truncTo<int>(rate + truncationSlack)).asString();
    const char* format = !integral(rate * 10) ? "%5.2f" : rate < 10 ? "%3.1f" : "%4.1f";
    return Any::sprintf(format, rate).asString();
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

Any QvFramerate::desc(bool showDf, bool showPulldown) const {
    const int fields = interlaced_ != 0 ? 2 : 1;
    std::string text = number(rate_ * fields) + (interlaced_ != 0 ? "i" : "p");
    if (showDf && df_) text += " DF";
    if (showPulldown && pulldown_ == doubling) {
        text += " -> " + number(fields * doubled(rate_).ratio()) + "p PD";
    } else if (showPulldown && pulldown_ != none) {
        const QvRatio shown = is32Pulldown(pulldown_) ? fiveQuarters(rate_) : rate_;
        text += " -> " + number(fields * 2 * shown.ratio()) + "i PD";
        if (pulldown_ == advanced32) text += "(A)";
    }
    return Any(text.c_str());
}

int QvFramerate::findInVector(const AnyVector& rates, bool exact, bool compareDf) const {
    const bool dfMatters = compareDf && (is23p() || is29p() || is59i() || is59p());
    const auto matches = [&](const QvFramerate& other) {
        if (!closeRates(rate_, other.rate_)) return false;
        if (dfMatters && df_ != other.df_) return false;
        if (exact) return interlaced_ == other.interlaced_ && pulldown_ == other.pulldown_;
        return (interlaced_ != 0) == (other.interlaced_ != 0) && samePulldownKind(pulldown_, other.pulldown_);
    };
    for (int i = 0; i < rates.size(); ++i)
        if (rates.at(i).isFramerate() && matches(rates.at(i).asFramerate())) return i;
    return -1;
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
