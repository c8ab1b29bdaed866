#include "core/document/qvsettingsmapper.h"

#include <algorithm>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <iterator>
#include <limits>
#include <optional>

#include "core/engine/log/qvlog.h"

namespace {

struct TypeRow {
    const char* name;
    int size;  // of one element; 0: the row's capacity
};

// In the order of ParamSpec::Type.
constexpr TypeRow types[] = {{"byte", 1}, {"short", 2}, {"int", 4}, {"dbl", 8}, {"load", 8}, {"str", 0}};
static_assert(std::size(types) == ParamSpec::typeStr + 1);

bool isKnown(int type) { return type >= 0 && type < static_cast<int>(std::size(types)); }

int elementSize(const ParamSpec& spec) {
    return spec.type == ParamSpec::typeStr ? spec.capacity : types[spec.type].size;
}

bool isVectorField(const ParamSpec& spec) { return spec.count >= 2; }

int fail(const char* format, const char* name) {
    qv_dbg()->error(format, name);
    return -1;
}

std::optional<long long> integerOf(const Any& value) {
    if (value.isInt()) return value.toInt64();
    if (!value.isFloat()) return std::nullopt;
    constexpr double bound = 9223372036854774784.0;  // the largest double that a 64-bit integer holds
    const double number = value.asDouble();
    if (std::isnan(number)) return std::nullopt;
    return static_cast<long long>(std::clamp(number, -bound, bound));
}

template <class T>
bool storeInteger(char* field, const Any& value) {
    const auto number = integerOf(value);
    if (!number) return false;
    const T stored = static_cast<T>(*number);
    std::memcpy(field, &stored, sizeof stored);
    return true;
}

bool storeDouble(char* field, const Any& value) {
    if (!value.isFloat() && !value.isInt()) return false;
    const double stored = value.isFloat() ? value.asDouble() : static_cast<double>(value.toInt64());
    std::memcpy(field, &stored, sizeof stored);
    return true;
}

bool storeText(char* field, int capacity, const Any& value) {
    if (!value.isText()) return false;
    const Any text = value.toString();
    const std::size_t length = std::strlen(text.asString(""));
    if (length >= static_cast<std::size_t>(std::max(capacity, 0))) return false;
    std::memcpy(field, text.asString(""), length + 1);
    return true;
}

// The type is known.
bool store(char* field, const ParamSpec& spec, const Any& value) {
    switch (spec.type) {
        case ParamSpec::typeByte: return storeInteger<std::uint8_t>(field, value);
        case ParamSpec::typeShort: return storeInteger<std::int16_t>(field, value);
        case ParamSpec::typeInt: return storeInteger<std::int32_t>(field, value);
        case ParamSpec::typeLoad: return storeInteger<std::int64_t>(field, value);
        case ParamSpec::typeDbl: return storeDouble(field, value);
        default: return storeText(field, spec.capacity, value);
    }
}

template <class T>
T load(const char* field) {
    T value;
    std::memcpy(&value, field, sizeof value);
    return value;
}

Any loadText(const char* field, int capacity) {
    const std::string text(field, strnlen(field, static_cast<std::size_t>(std::max(capacity, 0))));
    return Any(text.c_str());
}

Any fetch(const char* field, const ParamSpec& spec) {
    switch (spec.type) {
        case ParamSpec::typeByte: return Any(static_cast<int>(load<std::uint8_t>(field)));
        case ParamSpec::typeShort: return Any(static_cast<int>(load<std::int16_t>(field)));
        case ParamSpec::typeInt: return Any(static_cast<int>(load<std::int32_t>(field)));
        case ParamSpec::typeLoad: return Any(static_cast<long long>(load<std::int64_t>(field)));
        case ParamSpec::typeDbl: return Any(load<double>(field));
        default: return loadText(field, spec.capacity);
    }
}

void warnOfLength(const ParamSpec& spec, int given) {
    if (given > spec.count)
        qv_dbg()->warning(
            "[SettingsMapper]  Vector longer than parameter %s specification. It will be truncated to %d "
            "elements",
            spec.name, spec.count);
    else if (given < spec.count)
        qv_dbg()->warning(
            "[SettingsMapper]  Vector shorter than parameter %s specification. Only first %d of %d elements "
            "will "
            "be set",
            spec.name, given, spec.count);
}

// The bytes from a field to the one that follows it in the record.
int roomAfter(const ParamSpec* rows, const ParamSpec& field) {
    int next = 0;
    for (const ParamSpec* row = rows; row->name; ++row)
        if (row->offset > field.offset && (next == 0 || row->offset < next)) next = row->offset;
    return next == 0 ? 0 : (next - field.offset) / std::max(field.count, 1);
}

}  // namespace

QvSettingsMapper::QvSettingsMapper(const ParamSpec* rows) {
    for (const ParamSpec* row = rows; row && row->name; ++row) {
        ParamSpec spec = *row;
        if (spec.type == ParamSpec::typeStr && spec.capacity <= 0) spec.capacity = roomAfter(rows, spec);
        rows_.emplace(spec.name, spec);
    }
}

const char* QvSettingsMapper::typeName(int type) { return isKnown(type) ? types[type].name : "?"; }

int QvSettingsMapper::setFieldByName(void* record, const char* name, const Any& value) const {
    if (!name || !record) return -1;
    const auto found = rows_.find(std::string_view(name));
    if (found == rows_.end()) return fail("[SettingsMapper] Can not set, unknown field (%s)", name);
    const ParamSpec& spec = found->second;
    if (isVectorField(spec)) return setVector(record, spec, value);
    if (!isKnown(spec.type)) return fail("[SettingsMapper] read field of unsupported type (%s)", name);
    if (store(static_cast<char*>(record) + spec.offset, spec, value)) return 0;
    return fail("[SettingsMapper] Can not set, value does not fit the field (%s)", name);
}

int QvSettingsMapper::setVector(void* record, const ParamSpec& spec, const Any& value) const {
    if (!value.isVector())
        return fail("[SettingsMapper] read vector field which is not a vector (%s)", spec.name);
    if (!isKnown(spec.type))
        return fail("[SettingsMapper] read vector field of unsupported type (%s)", spec.name);
    const AnyVector& elements = value.asVector();
    warnOfLength(spec, elements.size());
    char* field = static_cast<char*>(record) + spec.offset;
    int result = 0;
    for (int i = 0; i < std::min(elements.size(), spec.count); ++i, field += elementSize(spec))
        if (!store(field, spec, elements.at(i)))
            result = fail("[SettingsMapper] Can not set, value does not fit the field (%s)", spec.name);
    return result;
}

Any QvSettingsMapper::getFieldByName(const void* record, const char* name) const {
    if (!name || !record) return Any();
    const auto found = rows_.find(std::string_view(name));
    if (found != rows_.end()) return getField(record, found->second);
    fail("[SettingsMapper] Can not get, unknown field (%s)", name);
    return Any();
}

Any QvSettingsMapper::getField(const void* record, const ParamSpec& row) const {
    // The caller's row lacks the capacity that the constructor has worked out.
    const auto own = row.name ? rows_.find(std::string_view(row.name)) : rows_.end();
    const ParamSpec& spec = own != rows_.end() && own->second.offset == row.offset ? own->second : row;
    const char* field = static_cast<const char*>(record) + spec.offset;
    if (!isKnown(spec.type)) {
        fail(isVectorField(spec) ? "[SettingsMapper] read vector field of unsupported type (%s)"
                                 : "[SettingsMapper] read field of unsupported type (%s)",
             spec.name);
        return Any();
    }
    if (!isVectorField(spec)) return fetch(field, spec);
    AnyVector elements;
    for (int i = 0; i < spec.count; ++i, field += elementSize(spec)) elements.append(fetch(field, spec));
    return Any(elements);
}

int QvSettingsMapper::dictToStruct(const AnyDict& dict, void* record) const {
    int result = 0;
    for (const auto [key, value] : dict)
        if (setFieldByName(record, key, *value) != 0) result = -1;
    return result;
}

void QvSettingsMapper::structToDict(const void* record, AnyDict& dict) const {
    for (const auto& [name, spec] : rows_) dict.set(name.c_str(), getField(record, spec));
}

void QvSettingsMapper::getNames(AnyVector& names) const {
    names.clear();
    for (const auto& [name, spec] : rows_) names.append(Any(name.c_str()));
}
