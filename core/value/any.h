// The dynamic value that carries every parameter, setting and stored state.
//
// An Any is a plain value of 16 bytes: 64 bits of payload, a size and a type. It owns what it holds, but
// for a Generic of size 0, which is a borrowed pointer. Copying is deep; moving gives the same value as
// copying. No operation locks: one thread at a time, or read-only by several.
//
//     Any rate = 25;                       // Int32
//     Any name("a.wav");                   // String, size() 5
//     if (name == "a.wav") ...             // text compares with a literal directly
//     int n = rate;                        // unchecked read, as asInt32()
//     int m = rate.asInt32(24);            // 24 unless the type is exactly Int32
//
// Failures of Any are programming errors: they throw QvAssertFailure (core/arch/qvassert.h).
#pragma once

#include <bit>
#include <concepts>
#include <cstdint>
#include <type_traits>
#include <utility>

#include "core/arch/api.h"

class AnyDict;
class AnyVector;
// Declared whole in "core/measure/qvgeometry.h".
class MediaTime;
class QvBitrate;
class QvFramerate;
class QvPoint;
class QvRect;

// Two integers, for instance a ratio or a width and height.
struct Pair {
    int first = 0;
    int second = 0;

    constexpr Pair() = default;
    constexpr Pair(int a, int b) : first(a), second(b) {}
    constexpr bool operator==(const Pair& other) const = default;
};

class QV_API Any {
  public:
    // The numbers are fixed; there is no type 11.
    enum Type : int {
        Invalid = -1,
        Int32 = 0,
        Float = 1,  // a double, also when set from a float
        String = 2,
        WString = 3,  // 16-bit units, UTF-16
        Dict = 4,
        Vector = 5,
        Int64 = 6,
        Generic = 7,  // size bytes, or for size 0 a borrowed pointer
        Framerate = 8,
        Point = 9,
        Rect = 10,
        Bitrate = 12,
        Pair = 13,
        MediaTime = 14,
    };

    // "Int32", ...; "*Unknown*" for any other number.
    static const char* typeName(int type);

    // The one shared invalid object that failed lookups return. isNull() is true for it alone, not for its
    // copies. Any assignment to it fails with "Attempt to assign to Any::null()".
    static Any& null();
    static Any& invalid() { return null(); }

    Any() noexcept = default;
    ~Any() {
        if (ownsStorage()) release();
    }

    Any(const Any& other) {
        if (other.isPlain())
            takePlain(other);
        else
            copyStorage(other);
    }
    Any(Any&& other) noexcept {
        if (other.isPlain())
            takePlain(other);
        else
            takeStorage(other);
    }
    Any& operator=(const Any& other) {
        set(other);
        return *this;
    }
    Any& operator=(Any&& other) {
        set(std::move(other));
        return *this;
    }

    Any(int value) noexcept : bits_(static_cast<std::uint32_t>(value)), size_(1), type_(Int32) {}
    Any(long long value) noexcept : bits_(static_cast<std::uint64_t>(value)), size_(1), type_(Int64) {}
    Any(long value) noexcept : Any(static_cast<long long>(value)) {}
    Any(float value) noexcept : Any(static_cast<double>(value)) {}
    Any(double value) noexcept : bits_(std::bit_cast<std::uint64_t>(value)), size_(1), type_(Float) {}
    Any(const char* text, int length = 0) { set(text, length); }
    Any(const unsigned short* text, int length = 0) { set(text, length); }
    Any(const char16_t* text, int length = 0) { set(text, length); }
    Any(const wchar_t*, int = 0) = delete;  // its units are not 16 bits wide everywhere
    Any(const void* data, int size = 0) { set(data, size); }
    Any(const AnyVector& value) { set(value); }
    Any(AnyVector&& value) { set(std::move(value)); }
    Any(const AnyDict& value) { set(value); }
    Any(AnyDict&& value) { set(std::move(value)); }
    Any(const QvFramerate& value) { set(value); }
    Any(const QvBitrate& value) { set(value); }
    Any(const ::Pair& value) { set(value); }
    Any(const ::MediaTime& value) { set(value); }
    Any(const QvPoint& value) { set(value); }
    Any(const QvRect& value) { set(value); }

    // Assignment. Storage is reused where the type stays the same: a container and an object keep their
    // address, a text its buffer if the new one is not longer. The source may lie inside this value. The
    // other way round it must be copied: a value can't be moved into a part of itself.
    void set(int value) { setPlain(Any(value)); }
    void set(long long value) { setPlain(Any(value)); }
    void set(long value) { setPlain(Any(value)); }
    void set(float value) { setPlain(Any(value)); }
    void set(double value) { setPlain(Any(value)); }
    // `length` characters, or for 0 up to the NUL. A source shorter than `length` is padded with NULs, which
    // count in size(). A null source is an assertion.
    void set(const char* text, int length = 0);
    // The same in 16-bit units; with a length of 0 at most 65,536 units are taken.
    void set(const unsigned short* text, int length = 0);
    void set(const char16_t* text, int length = 0);
    void set(const wchar_t*, int = 0) = delete;
    // size 0: borrows the pointer. size > 0: owns a copy of that many bytes, zeros if `data` is null.
    void set(const void* data, int size = 0);
    void set(const AnyVector& value);
    void set(AnyVector&& value);
    void set(const AnyDict& value);
    void set(AnyDict&& value);
    void set(const QvFramerate& value);
    void set(const QvBitrate& value);
    void set(const ::Pair& value);
    void set(const ::MediaTime& value);
    void set(const QvPoint& value);
    void set(const QvRect& value);
    // A text is measured again up to its NUL; a borrowed pointer stays borrowed.
    void set(const Any& other) {
        if (this == &other) return;
        if (other.isPlain())
            setPlain(other);
        else
            assign(other);
    }
    void set(Any&& other) {
        if (this == &other) return;
        if (other.isPlain())
            setPlain(other);
        else
            assign(std::move(other));
    }

    template <class T>
    requires(!std::same_as<std::remove_cvref_t<T>, Any> && std::constructible_from<Any, T>) Any& operator=(
        T&& value) {
        set(std::forward<T>(value));
        return *this;
    }

    int type() const { return type_; }
    // 0 for Invalid, the element count of a container, the length of a text, the bytes of a Generic, else 1.
    int size() const;
    bool isValid() const { return type_ != Invalid; }
    bool isNull() const { return size_ == nullMarker; }
    void invalidate();

    bool isInt32() const { return type_ == Int32; }
    bool isInt64() const { return type_ == Int64; }
    bool isFloat() const { return type_ == Float; }
    bool isDouble() const { return type_ == Float; }
    bool isString() const { return type_ == String; }
    bool isWString() const { return type_ == WString; }
    bool isDict() const { return type_ == Dict; }
    bool isVector() const { return type_ == Vector; }
    bool isGeneric() const { return type_ == Generic; }
    bool isFramerate() const { return type_ == Framerate; }
    bool isPoint() const { return type_ == Point; }
    bool isRect() const { return type_ == Rect; }
    bool isBitrate() const { return type_ == Bitrate; }
    bool isPair() const { return type_ == Pair; }
    bool isMediaTime() const { return type_ == MediaTime; }
    bool isText() const { return type_ == String || type_ == WString; }
    bool isInt() const { return type_ == Int32 || type_ == Int64; }

    // Unchecked reads: the payload as asked for, whatever the type says. A number read under another type is
    // its bits. Where the payload is no such object: a text read is null, a container read is the container's
    // null sentinel, an object read is an assertion. (A Generic may point to any of them.)
    int asInt32() const { return static_cast<int>(static_cast<std::uint32_t>(bits_)); }
    long long asInt64() const { return static_cast<long long>(bits_); }
    double asFloat() const { return std::bit_cast<double>(bits_); }
    double asDouble() const { return asFloat(); }
    char* asString() const { return isText() || isGeneric() ? static_cast<char*>(pointer()) : nullptr; }
    unsigned short* asWString() const {
        return isWString() || isGeneric() ? static_cast<unsigned short*>(pointer()) : nullptr;
    }
    void* asGeneric() const { return reinterpret_cast<void*>(static_cast<std::uintptr_t>(bits_)); }
    AnyDict& asDict();
    const AnyDict& asDict() const;
    AnyVector& asVector();
    const AnyVector& asVector() const;
    QvFramerate& asFramerate() const;
    QvPoint& asPoint() const;
    QvRect& asRect() const;
    QvBitrate& asBitrate() const;
    ::Pair& asPair() const;
    ::MediaTime& asMediaTime() const;

    operator int() const { return asInt32(); }
    operator long long() const { return asInt64(); }
    operator double() const { return asFloat(); }
    operator float() const { return static_cast<float>(asFloat()); }
    operator char*() const { return asString(); }
    operator unsigned short*() const { return asWString(); }
    operator void*() const { return asGeneric(); }
    operator AnyDict&() { return asDict(); }
    operator const AnyDict&() const { return asDict(); }
    operator AnyVector&() { return asVector(); }
    operator const AnyVector&() const { return asVector(); }
    // Null unless the type is the container's, or Generic.
    operator AnyDict*() const;
    operator AnyVector*() const;
    operator QvFramerate&() const { return asFramerate(); }
    operator QvPoint&() const { return asPoint(); }
    operator QvRect&() const { return asRect(); }
    operator QvBitrate&() const { return asBitrate(); }
    operator ::Pair&() const { return asPair(); }
    operator ::MediaTime&() const { return asMediaTime(); }

    // The value if the type is exactly the one named, else the argument. An Int32 is no Int64 here.
    int asInt32(int otherwise) const { return isInt32() ? asInt32() : otherwise; }
    long long asInt64(long long otherwise) const { return isInt64() ? asInt64() : otherwise; }
    double asFloat(double otherwise) const { return isFloat() ? asFloat() : otherwise; }
    double asDouble(double otherwise) const { return asFloat(otherwise); }
    const char* asString(const char* otherwise) const { return isString() ? asString() : otherwise; }
    const unsigned short* asWString(const unsigned short* otherwise) const {
        return isWString() ? asWString() : otherwise;
    }
    void* asGeneric(void* otherwise) const { return isGeneric() ? pointer() : otherwise; }

    // Int32, Int64 and Float into one another; any other type, text included, is an assertion. A Float is
    // truncated toward zero, one outside the range of the result gives the nearest limit, NaN gives 0.
    int toInt32() const;
    long long toInt64() const;
    double toDouble() const;
    double toFloat() const { return toDouble(); }

    // Text as UTF-8 or as UTF-16; invalid for a value that is no text. What is no valid text survives the way
    // there and back, as described in core/arch/widename.h, so that file names of any bytes keep their
    // meaning.
    Any toString() const;
    Any toWString() const;
    // Characters from `start` up to but not including `end`. Negative positions count from the end, -1 as
    // `end` being the end itself: Any("hello").substr(1, -1) is "ello". An empty part of a text that is not
    // empty can't be asked for: "Any.substr: index out of range".
    Any substr(int start, int end) const;
    // Replaces every occurrence, searching again from the start after each one; the result has at most 4,095
    // characters. A replacement that holds the search text fills the result up to that bound.
    Any replace(const Any& find, const Any& with) const;
    // The pieces between occurrences of the delimiter's first character; at least one element.
    AnyVector split(const Any& delimiter) const;
    // Two Strings give a String, all else a WString; an operand that is no text counts as empty.
    static Any strcat(const Any& a, const Any& b);
    // At most 2,047 characters. Numbers ignore the locale.
    static Any sprintf(const char* format, ...) QV_PRINTF(1, 2);

    // Equal values of one type. Numbers of different types are never equal: Any(1) != Any(1.0).
    bool operator==(const Any& other) const;
    bool operator!=(const Any& other) const { return !(*this == other); }
    // Orders by type number first, then by value; false for two values of one type without an order.
    bool operator<(const Any& other) const;
    // As above within one type, but false for two values of different types.
    bool operator>(const Any& other) const;
    // Numbers not 0, texts and containers not empty, a Generic that holds something; never anything else.
    bool isTrue() const;
    bool isFalse() const { return !isTrue(); }
    bool operator!() const { return !isTrue(); }
    operator bool() const { return isTrue(); }

  private:
    static constexpr int nullMarker = 0x66996699;

    std::uint64_t bits_ = 0;
    int size_ = 0;
    int type_ = Invalid;

    // Builds the marked object of null().
    Any(int value, int size, int type) noexcept
        : bits_(static_cast<std::uint32_t>(value)), size_(size), type_(type) {}

    void _checktype(Any::Type, const char*) {}

    static constexpr unsigned plainTypes =
        1u << (Invalid + 1) | 1u << (Int32 + 1) | 1u << (Float + 1) | 1u << (Int64 + 1);
    bool isPlain() const { return (plainTypes >> (type_ + 1)) & 1u; }
    bool ownsStorage() const { return !isPlain(); }
    void* pointer() const { return isPlain() ? nullptr : asGeneric(); }

    void takePlain(const Any& other) noexcept {
        bits_ = other.bits_;
        size_ = other.type_ == Invalid ? 0 : other.size_;  // the marker does not travel
        type_ = other.type_;
    }
    // `plain` may be a part of what is released, so it is read first.
    void setPlain(const Any& plain) {
        if (isNull()) failNull();
        const std::uint64_t bits = plain.bits_;
        const int type = plain.type_;
        const int size = type == Invalid ? 0 : plain.size_;
        if (ownsStorage()) release();
        bits_ = bits;
        size_ = size;
        type_ = type;
    }

    [[noreturn]] static void failNull();
    void refuseNull() const {
        if (isNull()) failNull();
    }
    // The payload is, or may be, an object of this type.
    bool holds(int type) const { return type_ == type || (type_ == Generic && pointer()); }
    void release() noexcept;  // frees what is held; the fields are stale afterwards
    void adopt(const void* storage, int size, int type) noexcept;
    void copyStorage(const Any& other);
    void takeStorage(Any& other) noexcept;
    void assign(const Any& other);
    void assign(Any&& other);
    template <class Unit>
    void setText(const Unit* text, int length, int type);
    template <class Stored, class T>
    void setObject(T&& value, int type);
    template <class T>
    T& object(int type) const;
};

// False for any type but String (WString in the wide form): a WString never equals a narrow literal.
QV_API bool operator==(const Any& a, const char* b);
QV_API bool operator==(const Any& a, const unsigned short* b);
inline bool operator==(const char* a, const Any& b) { return b == a; }
inline bool operator==(const unsigned short* a, const Any& b) { return b == a; }
inline bool operator!=(const Any& a, const char* b) { return !(a == b); }
inline bool operator!=(const Any& a, const unsigned short* b) { return !(a == b); }
inline bool operator!=(const char* a, const Any& b) { return !(b == a); }
inline bool operator!=(const unsigned short* a, const Any& b) { return !(b == a); }

// A number compares as the Any made from it, so the types must be the same.
template <class T>
requires(std::is_arithmetic_v<T>&& std::constructible_from<Any, T>) bool operator==(const Any& a, T b) {
    return a == Any(b);
}
template <class T>
requires(std::is_arithmetic_v<T>&& std::constructible_from<Any, T>) bool operator!=(const Any& a, T b) {
    return !(a == Any(b));
}
