#include "core/value/any.h"

#include <algorithm>
#include <cmath>
#include <cstdarg>
#include <cstring>
#include <limits>
#include <memory>

#include <string.h>

#include "core/arch/cformat.h"
#include "core/arch/qvassert.h"
#include "core/measure/qvgeometry.h"
#include "core/value/anycompare_p.h"
#include "core/value/anycontainer.h"
#include "core/value/anytext_p.h"

namespace {

// A wide text whose length is not given is not read beyond this.
constexpr int longestWide = 65536;

int measure(const char* text) {
    const std::size_t length = std::strlen(text);
    QV_ASSERT(length < static_cast<std::size_t>(std::numeric_limits<int>::max()));
    return static_cast<int>(length);
}

int measure(const unsigned short* text, int limit) {
    return static_cast<int>(std::find(text, text + limit, 0) - text);
}

int measure(const unsigned short* text) {
    int length = 0;
    while (length < longestWide && text[length]) ++length;
    return length;
}

int measure(const char* text, int limit) {
    return static_cast<int>(strnlen(text, static_cast<std::size_t>(limit)));
}

// Copies the source, which may overlap, and fills up with NULs.
template <class Unit>
void fill(Unit* target, const Unit* source, int count, int length) {
    std::memmove(target, source, static_cast<std::size_t>(count) * sizeof(Unit));
    std::fill(target + count, target + length + 1, Unit(0));
}

template <class T>
T limited(double value) {
    if (std::isnan(value)) return 0;
    // The lowest value is a power of two, and its negative the first one that does not fit.
    constexpr auto lowest = static_cast<double>(std::numeric_limits<T>::min());
    if (value < lowest) return std::numeric_limits<T>::min();
    if (value >= -lowest) return std::numeric_limits<T>::max();
    return static_cast<T>(value);
}

}  // namespace

const char* Any::typeName(int type) {
    static constexpr const char* names[] = {
        "Invalid", "Int32",     "Float", "String", "WString",   "Dict",    "Vector", "Int64",
        "Generic", "Framerate", "Point", "Rect",   "*Unknown*", "Bitrate", "Pair",   "MediaTime",
    };
    static_assert(std::size(names) == MediaTime + 2);
    return type < Invalid || type > MediaTime ? "*Unknown*" : names[type + 1];
}

Any& Any::null() {
    static Any shared(0, nullMarker, Invalid);
    return shared;
}

void Any::failNull() { QV_FAIL("Attempt to assign to Any::null()"); }

void Any::invalidate() {
    refuseNull();
    if (ownsStorage()) release();
    bits_ = 0;
    size_ = 0;
    type_ = Invalid;
}

int Any::size() const {
    switch (type_) {
        case Invalid: return 0;
        case Dict: return asDict().size();
        case Vector: return asVector().size();
        default: return size_;
    }
}

void Any::release() noexcept {
    void* const held = pointer();
    switch (type_) {
        case String: delete[] static_cast<char*>(held); break;
        case WString: delete[] static_cast<unsigned short*>(held); break;
        case Dict: delete static_cast<AnyDict*>(held); break;
        case Vector: delete static_cast<AnyVector*>(held); break;
        case Generic:
            if (size_ != 0) delete[] static_cast<char*>(held);
            break;
        case Framerate: delete static_cast<QvFramerate*>(held); break;
        case Point: delete static_cast<QvPoint*>(held); break;
        case Rect: delete static_cast<QvRect*>(held); break;
        case Bitrate: delete static_cast<QvBitrate*>(held); break;
        case Pair: delete static_cast<::Pair*>(held); break;
        case MediaTime: delete static_cast<::MediaTime*>(held); break;
        default: break;
    }
}

// The old storage goes last: the new one may have been made from a part of it.
void Any::adopt(const void* storage, int size, int type) noexcept {
    Any old;
    std::swap(old.bits_, bits_);
    std::swap(old.size_, size_);
    std::swap(old.type_, type_);
    bits_ = reinterpret_cast<std::uintptr_t>(storage);
    size_ = size;
    type_ = type;
}

template <class Unit>
void Any::setText(const Unit* text, int length, int type) {
    refuseNull();
    QV_ASSERT(text && length >= 0);
    if (length == 0) length = measure(text);
    const int count = measure(text, length);
    if (type_ == type && length <= size_) {
        fill(reinterpret_cast<Unit*>(pointer()), text, count, length);
        size_ = length;
        return;
    }
    auto fresh = std::make_unique_for_overwrite<Unit[]>(static_cast<std::size_t>(length) + 1);
    fill(fresh.get(), text, count, length);
    adopt(fresh.release(), length, type);
}

void Any::set(const char* text, int length) { setText(text, length, String); }
void Any::set(const unsigned short* text, int length) { setText(text, length, WString); }
void Any::set(const char16_t* text, int length) {
    set(reinterpret_cast<const unsigned short*>(text), length);
}

void Any::set(const void* data, int size) {
    refuseNull();
    QV_ASSERT(size >= 0);
    if (size == 0) return adopt(data, 0, Generic);
    const auto bytes = static_cast<std::size_t>(size);
    if (type_ == Generic && size_ == size) {
        if (data)
            std::memmove(pointer(), data, bytes);
        else
            std::memset(pointer(), 0, bytes);
        return;
    }
    auto fresh = std::make_unique<char[]>(bytes);
    if (data) std::memcpy(fresh.get(), data, bytes);
    adopt(fresh.release(), size, Generic);
}

template <class Stored, class T>
void Any::setObject(T&& value, int type) {
    refuseNull();
    if (type_ == type)
        *static_cast<Stored*>(pointer()) = std::forward<T>(value);
    else
        adopt(new Stored(std::forward<T>(value)), 1, type);
}

void Any::set(const AnyVector& value) { setObject<AnyVector>(value, Vector); }
void Any::set(AnyVector&& value) { setObject<AnyVector>(std::move(value), Vector); }
void Any::set(const AnyDict& value) { setObject<AnyDict>(value, Dict); }
void Any::set(AnyDict&& value) { setObject<AnyDict>(std::move(value), Dict); }
void Any::set(const QvFramerate& value) { setObject<QvFramerate>(value, Framerate); }
void Any::set(const QvBitrate& value) { setObject<QvBitrate>(value, Bitrate); }
void Any::set(const ::Pair& value) { setObject<::Pair>(value, Pair); }
void Any::set(const ::MediaTime& value) { setObject<::MediaTime>(value, MediaTime); }
void Any::set(const QvPoint& value) { setObject<QvPoint>(value, Point); }
void Any::set(const QvRect& value) { setObject<QvRect>(value, Rect); }

void Any::assign(const Any& other) {
    switch (other.type_) {
        case String: return set(other.asString());
        case WString: return set(other.asWString());
        case Dict: return set(other.asDict());
        case Vector: return set(other.asVector());
        case Generic: return set(static_cast<const void*>(other.pointer()), other.size_);
        case Framerate: return set(other.asFramerate());
        case Point: return set(other.asPoint());
        case Rect: return set(other.asRect());
        case Bitrate: return set(other.asBitrate());
        case Pair: return set(other.asPair());
        case MediaTime: return set(other.asMediaTime());
        default: break;
    }
}

// A container or object of the same type keeps its address, as references to it are in use.
void Any::assign(Any&& other) {
    refuseNull();
    if (type_ == other.type_ && type_ == Dict) return set(std::move(other.asDict()));
    if (type_ == other.type_ && type_ == Vector) return set(std::move(other.asVector()));
    if (type_ == other.type_ && !isText() && !isGeneric()) return assign(other);
    Any taken(std::move(other));
    adopt(taken.pointer(), taken.size_, taken.type_);
    taken.type_ = Invalid;
}

void Any::copyStorage(const Any& other) { assign(other); }

// Text is measured as in copying, so that a value does not depend on which of the two happened.
void Any::takeStorage(Any& other) noexcept {
    bits_ = std::exchange(other.bits_, 0);
    size_ = std::exchange(other.size_, 0);
    type_ = std::exchange(other.type_, Invalid);
    if (type_ == String)
        size_ = measure(asString(), size_);
    else if (type_ == WString)
        size_ = measure(asWString(), std::min(size_, longestWide));
    if (type_ == WString) asWString()[size_] = 0;
}

AnyDict& Any::asDict() { return holds(Dict) ? *static_cast<AnyDict*>(pointer()) : AnyDict::null(); }
const AnyDict& Any::asDict() const {
    return holds(Dict) ? *static_cast<AnyDict*>(pointer()) : AnyDict::null();
}
AnyVector& Any::asVector() { return holds(Vector) ? *static_cast<AnyVector*>(pointer()) : AnyVector::null(); }
const AnyVector& Any::asVector() const {
    return holds(Vector) ? *static_cast<AnyVector*>(pointer()) : AnyVector::null();
}
Any::operator AnyDict*() const { return holds(Dict) ? static_cast<AnyDict*>(pointer()) : nullptr; }
Any::operator AnyVector*() const { return holds(Vector) ? static_cast<AnyVector*>(pointer()) : nullptr; }

template <class T>
T& Any::object(int type) const {
    QV_ASSERT(holds(type));
    return *static_cast<T*>(pointer());
}

QvFramerate& Any::asFramerate() const { return object<QvFramerate>(Framerate); }
QvPoint& Any::asPoint() const { return object<QvPoint>(Point); }
QvRect& Any::asRect() const { return object<QvRect>(Rect); }
QvBitrate& Any::asBitrate() const { return object<QvBitrate>(Bitrate); }
Pair& Any::asPair() const { return object<::Pair>(Pair); }
MediaTime& Any::asMediaTime() const { return object<::MediaTime>(MediaTime); }

int Any::toInt32() const {
    switch (type_) {
        case Int32:
        case Int64: return asInt32();
        case Float: return limited<int>(asFloat());
        default: QV_FAIL_PLAIN();
    }
}

long long Any::toInt64() const {
    switch (type_) {
        case Int32: return asInt32();
        case Int64: return asInt64();
        case Float: return limited<long long>(asFloat());
        default: QV_FAIL_PLAIN();
    }
}

double Any::toDouble() const {
    switch (type_) {
        case Int32: return asInt32();
        case Int64: return static_cast<double>(asInt64());
        case Float: return asFloat();
        default: QV_FAIL_PLAIN();
    }
}

Any Any::toString() const { return qvNarrowText(*this); }
Any Any::toWString() const { return qvWideText(*this); }
Any Any::substr(int start, int end) const { return qvTextPart(*this, start, end); }
Any Any::replace(const Any& find, const Any& with) const { return qvTextReplaced(*this, find, with); }
AnyVector Any::split(const Any& delimiter) const { return qvTextPieces(*this, delimiter); }
Any Any::strcat(const Any& a, const Any& b) { return qvTextAppended(a, b); }

Any Any::sprintf(const char* format, ...) {
    char buffer[2048];
    va_list args;
    va_start(args, format);
    const int length = qv_vformat(buffer, sizeof buffer, format, args);
    va_end(args);
    return Any(length < 0 ? "" : buffer);
}

bool Any::operator==(const Any& other) const {
    if (type_ != other.type_ || size_ != other.size_) return false;
    return type_ == Int32 ? asInt32() == other.asInt32() : qvSameContents(*this, other);
}

bool Any::operator<(const Any& other) const { return qvAnyBefore(*this, other); }
bool Any::operator>(const Any& other) const { return type_ == other.type_ && qvAnyBefore(other, *this); }

bool Any::isTrue() const {
    switch (type_) {
        case Int32: return asInt32() != 0;
        case Int64: return asInt64() != 0;
        case Float: return asFloat() != 0.0;
        case String:
        case WString: return size_ > 0;
        case Dict:
        case Vector: return size() > 0;
        case Generic: return size_ != 0 || pointer() != nullptr;
        default: return false;
    }
}
