#include "core/engine/params.h"

#include <cmath>
#include <utility>

#include "core/media/qvgeometry.h"

namespace {

// The first double that is too large for an integer type: 2^31, 2^32 or 2^63, all exact.
template <class Integer>
constexpr double upperBound = static_cast<double>(std::numeric_limits<Integer>::max() / 2 + 1) * 2;

template <class Integer>
bool truncated(double from, Integer& to) {
    const double whole = std::trunc(from);
    if (!(whole >= static_cast<double>(std::numeric_limits<Integer>::min()) && whole < upperBound<Integer>))
        return false;  // NaN too
    to = static_cast<Integer>(whole);
    return true;
}

template <class Integer>
bool integer(const Any& from, Integer& to) {
    if (from.isFloat()) return truncated(from.asFloat(), to);
    if (!from.isInt() || !std::in_range<Integer>(from.toInt64())) return false;
    to = static_cast<Integer>(from.toInt64());
    return true;
}

bool isNumber(const Any& value) { return value.isInt() || value.isFloat(); }

}  // namespace

namespace qvparam {

bool convert(const Any& from, int& to) { return integer(from, to); }
bool convert(const Any& from, unsigned& to) { return integer(from, to); }
bool convert(const Any& from, long long& to) { return integer(from, to); }

bool convert(const Any& from, bool& to) {
    if (!isNumber(from)) return false;
    to = from.isTrue();
    return true;
}

bool convert(const Any& from, double& to) {
    if (!isNumber(from) || std::isnan(from.toDouble())) return false;
    to = from.toDouble();
    return true;
}

bool convert(const Any& from, std::string& to) {
    if (from.isValid() && !from.isText()) return false;
    const Any narrow = from.toString();
    to = narrow.asString("");
    return true;
}

bool convert(const Any& from, AnyDict& to) {
    if (!from.isDict()) return false;
    to = from.asDict();
    return true;
}

bool convert(const Any& from, AnyVector& to) {
    if (!from.isVector()) return false;
    to = from.asVector();
    return true;
}

bool convert(const Any& from, QvFramerate& to) {
    if (from.isFramerate()) {
        to = from.asFramerate();
        return true;
    }
    if (!isNumber(from)) return false;
    const QvFramerate rate(from.toDouble());
    if (!(rate.rate() > 0)) return false;  // no fraction comes near, or no rate at all
    to = rate;
    return true;
}

bool convert(const Any& from, QvRect& to) {
    if (!from.isRect()) return false;
    to = from.asRect();
    return true;
}

bool convert(const Any& from, QvPoint& to) {
    if (!from.isPoint()) return false;
    to = from.asPoint();
    return true;
}

bool convert(const Any& from, Pair& to) {
    if (!from.isPair()) return false;
    to = from.asPair();
    return true;
}

bool convert(const Any& from, MediaTime& to) {
    if (!from.isMediaTime()) return false;
    to = from.asMediaTime();
    return true;
}

bool convert(const Any& from, QvBitrate& to) {
    if (!from.isBitrate()) return false;
    to = from.asBitrate();
    return true;
}

}  // namespace qvparam
