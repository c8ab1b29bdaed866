// Parameters of a codec as rows over its typed fields.
//
// A codec keeps typed members and one constexpr table; the table serves setParam, getParam, store,
// restore and the parameter descriptions. An Any is checked and converted once, here at the door.
//
//     struct Fade { double start = 0; int frames = 25; bool invert = false; };
//     constexpr QvParamRow<Fade> rows[] = {
//         {"start",  &Fade::start},
//         {"frames", &Fade::frames, qvParamStored, 1, 1000},
//         {"invert", &Fade::invert},
//     };
//     int setParam(const char* name, const Any& value) {
//         if (auto result = qvSetParamRow<Fade>(rows, fade, name, value)) return *result;
//         return QvVideoFilter::setParam(name, value);
//     }
//
// What a row can't say (side effects, indexed names as "channel3_volume") is written by hand beside it.
#pragma once

#include <cstring>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <type_traits>
#include <variant>

#include "core/engine/status.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

// A unit that makes a table includes "core/media/qvgeometry.h" for these.
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
};

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
    const char* description = "";
};

namespace qvparam {

// Conversions of the door. Each returns false, and leaves `to` alone, if `from` can't be such a value.
QV_API bool convert(const Any& from, int& to);
QV_API bool convert(const Any& from, unsigned& to);
QV_API bool convert(const Any& from, bool& to);
QV_API bool convert(const Any& from, double& to);
QV_API bool convert(const Any& from, long long& to);
QV_API bool convert(const Any& from, std::string& to);  // String as it is, WString as UTF-8, invalid as empty
QV_API bool convert(const Any& from, AnyDict& to);
QV_API bool convert(const Any& from, AnyVector& to);
QV_API bool convert(const Any& from, QvFramerate& to);  // also a Float or integer: frames a second
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
        to = static_cast<int>(from);
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

// Sets the member behind a row. nullopt: no row takes this name, so the caller asks its base.
// QvStatus::invalidParam: the value has a wrong type or lies outside the range; the member is unchanged.
template <class T>
std::optional<int> qvSetParamRow(std::span<const QvParamRow<T>> rows, T& object, const char* name,
                                 const Any& value) {
    const auto* row = qvFindParamRow(rows, name);
    if (!row || (row->flags & qvParamReadOnly)) return std::nullopt;
    if (row->flags & qvParamIgnored) return QvStatus::ok;
    return std::visit(
        [&](auto member) -> std::optional<int> {
            using M = decltype(member);
            if constexpr (std::is_same_v<M, std::monostate>) {
                return QvStatus::ok;
            } else if constexpr (std::is_same_v<M, QvParamAccess<T>>) {
                if (!member.set) return std::nullopt;
                return member.set(object, value);
            } else {
                return qvparam::assign(object, member, *row, value);
            }
        },
        row->member);
}

// Writes the value behind a row and returns true; false if no row answers to this name.
template <class T>
bool qvGetParamRow(std::span<const QvParamRow<T>> rows, const T& object, const char* name, Any& value) {
    const auto* row = qvFindParamRow(rows, name);
    if (!row || (row->flags & (qvParamIgnored | qvParamWriteOnly))) return false;
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
// other than ok, or ok.
template <class T>
int qvRestoreParamRows(std::span<const QvParamRow<T>> rows, T& object, const AnyDict& dict) {
    int result = QvStatus::ok;
    for (const auto& row : rows) {
        if (!(row.flags & qvParamStored) || !dict.isSet(row.name)) continue;
        const auto status = qvSetParamRow(rows, object, row.name, dict.get(row.name));
        if (status && *status != QvStatus::ok && result == QvStatus::ok) result = *status;
    }
    return result;
}
