// Parameters of a codec as rows over its typed fields.
//
// A codec keeps typed members and one constexpr table; the table is used by setParam, getParam, store,
// restore and the parameter descriptions. An Any is checked and converted once, here at the door.
//
//     struct Settings { double start = 0; int frames = 25; bool invert = false; };
//     constexpr QvParamRow<Settings> rows[] = {
//         {"start", &Settings::start},
//         {"frames", &Settings::frames, qvParamStored, 1, 1000, "length of the fade"},
//         {"invert", &Settings::invert},
//     };
//     static_assert(qvParamTableOk<Settings>(rows));
//
//     int Fade::setParam(const char* name, const Any& value) {
//         if (auto result = _setRow<Settings>(rows, settings_, name, value)) return *result;
//         return QvVideoFilter::setParam(name, value);
//     }
//     void Fade::getParam(const char* name, Any& value) const {
//         if (!qvGetParamRow<Settings>(rows, settings_, name, value)) QvVideoFilter::getParam(name, value);
//     }
//
// What a row can't say (side effects, indexed names as "channel3_volume") is written by hand next to it.
#pragma once

#include <climits>
#include <cstring>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <variant>

#include "core/engine/modules/qvcodec.h"
#include "core/engine/status.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

// A unit that makes a table includes "core/measure/qvgeometry.h" for these.
class QvFramerate;
class QvRect;
class QvPoint;
class QvBitrate;
class MediaTime;

enum QvParamFlag : unsigned {
    qvParamPlain = 0,
    qvParamStored = 1,     // written by store and read by restore
    qvParamReadOnly = 2,   // getParam answers; setParam treats the name as unknown
    qvParamIgnored = 4,    // setParam accepts it with 0 and no effect; getParam does not know it
    qvParamWriteOnly = 8,  // setParam takes it; getParam does not know it
    qvParamByHand = 16,    // the codec itself takes or answers the name; the row only describes it
    qvParamNeeded = 32,  // without it the codec works with a value that nobody can mean, as a size of a file
};

// getParam of this name answers with the descriptions of all rows that a codec and its bases have, see
// qvParameters. Each table adds its own while the name passes from a class to its base.
inline constexpr const char* qvParamRowsName = "_parameters";

// For what is not a plain member: `set` returns a status (null: read-only), `get` writes its Any (null:
// write-only).
template <class T>
struct QvParamAccess {
    int (*set)(T&, const Any&) = nullptr;
    void (*get)(const T&, Any&) = nullptr;
};

template <class T>
struct QvParamRow {
    using Member =
        std::variant<std::monostate, int T::*, bool T::*, double T::*, long long T::*, unsigned T::*,
                     std::string T::*, Any T::*, AnyDict T::*, AnyVector T::*, QvFramerate T::*, QvRect T::*,
                     QvPoint T::*, Pair T::*, MediaTime T::*, QvBitrate T::*, QvParamAccess<T>>;
    const char* name = nullptr;
    Member member{};
    unsigned flags = qvParamPlain;
    // Inclusive range of a numeric row. A value outside is refused with QvStatus::invalidParam.
    double min = std::numeric_limits<double>::lowest();
    double max = std::numeric_limits<double>::max();
    const char* description = "";  // for a user interface
    const char* unit = "";
    const char* help = "";    // for a manual, where the description is not enough
    int type = Any::Invalid;  // Any::Type of a value without a plain member, if it is not that of its default
};

namespace qvparam {

// Conversions of the door. Each returns false, and leaves `to` alone, if `from` can't be such a value.
// Numbers are Int32, Int64 and Float; an integer takes a Float without its fraction, and what does not fit,
// or is no number (NaN), is refused. Text never becomes a number.
QV_API bool convert(const Any& from, int& to);
QV_API bool convert(const Any& from, unsigned& to);
QV_API bool convert(const Any& from, bool& to);  // any number, true unless 0
QV_API bool convert(const Any& from, double& to);
QV_API bool convert(const Any& from, long long& to);
QV_API bool convert(const Any& from, std::string& to);  // String as it is, WString as UTF-8, invalid as empty
QV_API bool convert(const Any& from, AnyDict& to);
QV_API bool convert(const Any& from, AnyVector& to);
QV_API bool convert(const Any& from, QvFramerate& to);  // also a number above 0: frames a second
QV_API bool convert(const Any& from, QvRect& to);
QV_API bool convert(const Any& from, QvPoint& to);
QV_API bool convert(const Any& from, Pair& to);
QV_API bool convert(const Any& from, MediaTime& to);
QV_API bool convert(const Any& from, QvBitrate& to);
inline bool convert(const Any& from, Any& to) {
    to = from;
    return true;
}

template <class V>
void deliver(const V& from, Any& to) {
    if constexpr (std::is_same_v<V, bool>)
        to = from ? 1 : 0;
    else if constexpr (std::is_same_v<V, unsigned>)
        from <= INT_MAX ? to.set(static_cast<int>(from)) : to.set(static_cast<long long>(from));
    else if constexpr (std::is_same_v<V, std::string>)
        to = Any(from.c_str());
    else
        to = from;
}

template <class V>
bool inRange(const V& value, double min, double max) {
    if constexpr (std::is_arithmetic_v<V> && !std::is_same_v<V, bool>)
        return static_cast<double>(value) >= min && static_cast<double>(value) <= max;  // false for NaN
    else
        return true;
}

// What a row holds, for people.
enum class Kind {
    integer,
    natural,
    number,
    flag,
    text,
    dictionary,
    list,
    framerate,
    rectangle,
    point,
    pair,
    time,
    bitrate,
    any,
    special
};

template <class V>
constexpr Kind kindOf() {
    if constexpr (std::is_same_v<V, int> || std::is_same_v<V, long long>) return Kind::integer;
    if constexpr (std::is_same_v<V, unsigned>) return Kind::natural;
    if constexpr (std::is_same_v<V, double>) return Kind::number;
    if constexpr (std::is_same_v<V, bool>) return Kind::flag;
    if constexpr (std::is_same_v<V, std::string>) return Kind::text;
    if constexpr (std::is_same_v<V, AnyDict>) return Kind::dictionary;
    if constexpr (std::is_same_v<V, AnyVector>) return Kind::list;
    if constexpr (std::is_same_v<V, QvFramerate>) return Kind::framerate;
    if constexpr (std::is_same_v<V, QvRect>) return Kind::rectangle;
    if constexpr (std::is_same_v<V, QvPoint>) return Kind::point;
    if constexpr (std::is_same_v<V, Pair>) return Kind::pair;
    if constexpr (std::is_same_v<V, MediaTime>) return Kind::time;
    if constexpr (std::is_same_v<V, QvBitrate>) return Kind::bitrate;
    if constexpr (std::is_same_v<V, Any>) return Kind::any;
    return Kind::special;
}

template <class T>
Kind kindOfRow(const QvParamRow<T>& row) {
    auto kind = []<class V>(V T::*) { return kindOf<V>(); };
    return std::visit(
        [&](auto member) {
            if constexpr (std::is_member_pointer_v<decltype(member)>)
                return kind(member);
            else
                return Kind::special;
        },
        row.member);
}

// "'frames' takes an integer from 1 to 1000, not 5000".
QV_API std::string refusal(const char* name, Kind kind, double min, double max, const Any& value);
// Adds "type", "min" and "max" as far as the kind has them; a "special" row has the type of its value.
QV_API void describe(Kind kind, double min, double max, const Any& value, AnyDict& row);

// Appends the Dicts of `rows` to `value`, an invalid value or a Vector.
QV_API void collect(const AnyVector& rows, Any& value);

template <class T, class V>
int assign(T& object, V T::*member, const QvParamRow<T>& row, const Any& value) {
    V converted{};
    if (!convert(value, converted) || !inRange(converted, row.min, row.max)) return QvStatus::invalidParam;
    object.*member = std::move(converted);
    return QvStatus::ok;
}

}  // namespace qvparam

template <class T>
const QvParamRow<T>* qvFindParamRow(std::span<const QvParamRow<T>> rows, const char* name) {
    for (const auto& row : rows)
        if (name && std::strcmp(row.name, name) == 0) return &row;
    return nullptr;
}

template <class T>
AnyVector qvDescribeParamRows(std::span<const QvParamRow<T>> rows, const T& defaults);

// False for a name that only getParam answers.
template <class T>
bool qvTakesValue(const QvParamRow<T>& row) {
    if (row.flags & qvParamByHand) return false;
    const auto* access = std::get_if<QvParamAccess<T>>(&row.member);
    return !(row.flags & qvParamReadOnly) && (!access || access->set || (row.flags & qvParamIgnored));
}

// Sets the member of a row. nullopt: no row takes this name, so the caller asks its base.
// QvStatus::invalidParam: the value has a wrong type or lies outside the range; the member is unchanged.
template <class T>
std::optional<int> qvSetParamRow(std::span<const QvParamRow<T>> rows, T& object, const char* name,
                                 const Any& value) {
    const auto* row = qvFindParamRow(rows, name);
    if (!row || !qvTakesValue(*row)) return std::nullopt;
    if (row->flags & qvParamIgnored) return QvStatus::ok;
    return std::visit(
        [&](auto member) -> std::optional<int> {
            using M = decltype(member);
            if constexpr (std::is_same_v<M, std::monostate>) {
                return QvStatus::ok;
            } else if constexpr (std::is_same_v<M, QvParamAccess<T>>) {
                return member.set(object, value);
            } else {
                return qvparam::assign(object, member, *row, value);
            }
        },
        row->member);
}

// Writes the value of a row and returns true; false if no row answers to this name, so that the caller
// asks its base.
template <class T>
bool qvGetParamRow(std::span<const QvParamRow<T>> rows, const T& object, const char* name, Any& value) {
    const auto* row = qvFindParamRow(rows, name);
    if (!row && name && std::strcmp(name, qvParamRowsName) == 0)
        qvparam::collect(qvDescribeParamRows(rows, object), value);
    if (!row || (row->flags & (qvParamIgnored | qvParamWriteOnly | qvParamByHand))) return false;
    return std::visit(
        [&](auto member) {
            using M = decltype(member);
            if constexpr (std::is_same_v<M, std::monostate>) {
                return false;
            } else if constexpr (std::is_same_v<M, QvParamAccess<T>>) {
                if (member.get) member.get(object, value);
                return member.get != nullptr;
            } else {
                qvparam::deliver(object.*member, value);
                return true;
            }
        },
        row->member);
}

// Adds every stored row to `dict`.
template <class T>
void qvStoreParamRows(std::span<const QvParamRow<T>> rows, const T& object, AnyDict& dict) {
    for (const auto& row : rows) {
        if (!(row.flags & qvParamStored)) continue;
        Any value;
        if (qvGetParamRow(rows, object, row.name, value)) dict.set(row.name, value);
    }
}

// Takes every stored row that `dict` holds; rows it lacks keep their value. The result is the first status
// other than ok, or ok. `refused`, which may be null, becomes the row of that status, or null.
template <class T>
int qvRestoreParamRows(std::span<const QvParamRow<T>> rows, T& object, const AnyDict& dict,
                       const QvParamRow<T>** refused = nullptr) {
    int result = QvStatus::ok;
    if (refused) *refused = nullptr;
    for (const auto& row : rows) {
        if (!(row.flags & qvParamStored) || !dict.isSet(row.name)) continue;
        const auto status = qvSetParamRow(rows, object, row.name, dict.get(row.name));
        if (!status || *status == QvStatus::ok || result != QvStatus::ok) continue;
        result = *status;
        if (refused) *refused = &row;
    }
    return result;
}

// For a static_assert below each table: every name is there once and short enough for a dictionary, and no
// range is empty.
template <class T>
constexpr bool qvParamTableOk(std::span<const QvParamRow<T>> rows) {
    for (std::size_t i = 0; i < rows.size(); ++i) {
        if (!rows[i].name || !*rows[i].name || !(rows[i].min <= rows[i].max)) return false;
        const std::string_view name = rows[i].name;
        if (name.size() > static_cast<std::size_t>(AnyDict::maxKeyLength)) return false;
        for (std::size_t k = 0; k < i; ++k)
            if (name == rows[k].name) return false;
    }
    return true;
}

// Why a row refuses a value, for a user; "" if there is no such row.
template <class T>
std::string qvParamRefusal(std::span<const QvParamRow<T>> rows, const char* name, const Any& value) {
    const auto* row = qvFindParamRow(rows, name);
    return row ? qvparam::refusal(row->name, qvparam::kindOfRow(*row), row->min, row->max, value) : "";
}

// One Dict for each row that takes or gives a value: "name", "type" (as Any::typeName), "min" and "max"
// (Float, where there is a range), "default" (what `defaults` holds), "description", "unit" and "help" (if
// the row has one), "readOnly", "writeOnly" or "needed" (1).
template <class T>
AnyVector qvDescribeParamRows(std::span<const QvParamRow<T>> rows, const T& defaults) {
    AnyVector all;
    for (const auto& row : rows) {
        if (row.flags & qvParamIgnored) continue;
        AnyDict described("name", row.name);
        Any value;
        if (qvGetParamRow(rows, defaults, row.name, value)) described.set("default", value);
        qvparam::describe(qvparam::kindOfRow(row), row.min, row.max, value, described);
        if (row.type != Any::Invalid) described.set("type", Any::typeName(row.type));
        if (*row.description) described.set("description", row.description);
        if (*row.unit) described.set("unit", row.unit);
        if (*row.help) described.set("help", row.help);
        const bool settable = row.flags & qvParamByHand ? !(row.flags & qvParamReadOnly) : qvTakesValue(row);
        if (!settable) described.set("readOnly", 1);
        if (row.flags & qvParamWriteOnly) described.set("writeOnly", 1);
        if (row.flags & qvParamNeeded) described.set("needed", 1);
        all.append(described);
    }
    return all;
}

// The parameters of a codec, as its tables describe them: a Dict for each, as of qvDescribeParamRows.
// "default" is the present value, that of a new codec being its default. A name that a class and its base
// both have is there once, as the class has it. Names that framework and codecs use among themselves begin
// with '_'.
QV_API AnyVector qvParameters(const QvCodec& codec);

template <class T>
std::optional<int> QvCodec::_setRow(std::span<const QvParamRow<T>> rows, T& object, const char* name,
                                    const Any& value) {
    const auto* row = qvFindParamRow(rows, name);
    if (!row || !qvTakesValue(*row)) return std::nullopt;
    _traceParam(name, value);
    const std::optional<int> result = qvSetParamRow(rows, object, name, value);
    if (result == QvStatus::invalidParam) setError(*result, "%s", qvParamRefusal(rows, name, value).c_str());
    return result;
}

// A field with a setter of its own may have given its reason already.
template <class T>
int QvCodec::_restoreRows(std::span<const QvParamRow<T>> rows, T& object, const AnyDict& dict) {
    const QvParamRow<T>* refused = nullptr;
    setError(QvStatus::ok);
    const int result = qvRestoreParamRows(rows, object, dict, &refused);
    if (refused && !*errorDesc())
        setError(result, "invalid value in the stored state: %s",
                 qvParamRefusal(rows, refused->name, dict.get(refused->name)).c_str());
    return result;
}
