#include "core/engine/modules/params.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <iterator>
#include <utility>

#include "core/measure/qvgeometry.h"

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

struct KindRow {
    qvparam::Kind kind;
    const char* phrase;
    int type;  // Any::Type
};

using qvparam::Kind;

constexpr KindRow kinds[] = {
    {Kind::integer, "an integer", Any::Int32},
    {Kind::natural, "an integer", Any::Int32},
    {Kind::number, "a number", Any::Float},
    {Kind::flag, "a flag (0 or 1)", Any::Int32},
    {Kind::text, "a text", Any::String},
    {Kind::dictionary, "a dictionary", Any::Dict},
    {Kind::list, "a list", Any::Vector},
    {Kind::framerate, "a frame rate", Any::Framerate},
    {Kind::rectangle, "a rectangle", Any::Rect},
    {Kind::point, "a point", Any::Point},
    {Kind::pair, "a pair of integers", Any::Pair},
    {Kind::time, "a media time", Any::MediaTime},
    {Kind::bitrate, "a bit rate", Any::Bitrate},
    {Kind::any, "any value", Any::Invalid},
    {Kind::special, "another value", Any::Invalid},
};
static_assert(std::size(kinds) == static_cast<std::size_t>(Kind::special) + 1);

const KindRow& rowOf(Kind kind) { return kinds[static_cast<std::size_t>(kind)]; }

// Bounds that say something, "lowest" and "max" of double otherwise.
struct Range {
    double min;
    double max;
    bool hasMin() const { return min > std::numeric_limits<double>::lowest(); }
    bool hasMax() const { return max < std::numeric_limits<double>::max(); }
};

Range rangeOf(Kind kind, double min, double max) {
    switch (kind) {
        case Kind::integer:
        case Kind::special:
        case Kind::number: return {min, max};
        case Kind::natural: return {std::max(min, 0.0), std::min(max, upperBound<unsigned> - 1)};
        case Kind::flag: return {0, 1};
        default: return {std::numeric_limits<double>::lowest(), std::numeric_limits<double>::max()};
    }
}

// The shortest digits that read back as the same number, whatever the locale.
std::string digits(double value) {
    char text[400];
    const auto format = std::abs(value) < 1e15 ? std::chars_format::fixed : std::chars_format::general;
    return {text, std::to_chars(text, std::end(text), value, format).ptr};
}

std::string phraseOf(const Range& range) {
    if (range.hasMin() && range.hasMax()) return " from " + digits(range.min) + " to " + digits(range.max);
    if (range.hasMin()) return " of at least " + digits(range.min);
    if (range.hasMax()) return " of at most " + digits(range.max);
    return "";
}

std::string shown(const Any& value) {
    if (value.isInt()) return std::to_string(value.toInt64());
    if (value.isFloat()) return digits(value.asFloat());
    if (!value.isText()) return std::string("a value of type ") + Any::typeName(value.type());
    const Any narrow = value.toString();
    return std::string("\"").append(narrow.asString("")).append("\"");
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
    double perSecond = 0;
    if (!convert(from, perSecond) || !(perSecond > 0) || !std::isfinite(perSecond)) return false;
    const QvFramerate rate(perSecond);
    if (rate.rate().num <= 0) return false;  // no fraction comes near
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

std::string refusal(const char* name, Kind kind, double min, double max, const Any& value) {
    const std::string range = kind == Kind::flag ? "" : phraseOf(rangeOf(kind, min, max));
    return std::string("'") + name + "' takes " + rowOf(kind).phrase + range + ", not " + shown(value);
}

void describe(Kind kind, double min, double max, const Any& value, AnyDict& row) {
    const int type = rowOf(kind).type;
    row.set("type", Any::typeName(type == Any::Invalid ? value.type() : type));
    const Range range = rangeOf(kind, min, max);
    if (range.hasMin()) row.set("min", range.min);
    if (range.hasMax()) row.set("max", range.max);
}

void collect(const AnyVector& rows, Any& value) {
    AnyVector all = value.isVector() ? value.asVector() : AnyVector();
    for (const Any& row : rows) all.append(row);
    value = all;
}

}  // namespace qvparam

AnyVector qvParameters(const QvCodec& codec) {
    const Any all = codec.getParam(qvParamRowsName);
    AnyVector once;
    if (!all.isVector()) return once;
    const auto isThere = [&](const Any& name) {
        return std::any_of(once.begin(), once.end(),
                           [&](const Any& row) { return row.asDict().get("name") == name; });
    };
    for (const Any& row : all.asVector())
        if (!isThere(row.asDict().get("name"))) once.append(row);
    return once;
}
