// Order, equality and truth of Any.
#include <algorithm>
#include <cstring>
#include <span>

#include "core/measure/qvgeometry.h"
#include "core/value/any.h"
#include "core/value/anycontainer.h"

namespace {

// Characters compare as unsigned numbers in both widths.
auto narrow(const Any& text) {
    return std::span(reinterpret_cast<const unsigned char*>(text.asString()),
                     static_cast<std::size_t>(text.size()));
}
auto wide(const Any& text) { return std::span(text.asWString(), static_cast<std::size_t>(text.size())); }

template <class Span>
bool before(Span a, Span b) {
    return std::lexicographical_compare(a.begin(), a.end(), b.begin(), b.end());
}

template <class Span>
bool same(Span a, Span b) {
    return std::equal(a.begin(), a.end(), b.begin(), b.end());
}

}  // namespace

bool Any::operator==(const Any& other) const {
    if (type_ != other.type_ || size_ != other.size_) return false;
    switch (type_) {
        case Invalid: return true;
        case Int32: return asInt32() == other.asInt32();
        case Int64: return asInt64() == other.asInt64();
        case Float: return asFloat() == other.asFloat();  // false for NaN, true for 0.0 and -0.0
        case String: return same(narrow(*this), narrow(other));
        case WString: return same(wide(*this), wide(other));
        case Dict: return asDict() == other.asDict();
        case Vector: return asVector() == other.asVector();
        case Generic:
            return pointer() == other.pointer() ||
                   (size_ > 0 &&
                    std::memcmp(pointer(), other.pointer(), static_cast<std::size_t>(size_)) == 0);
        case Framerate: return asFramerate() == other.asFramerate();
        case Point: return asPoint() == other.asPoint();
        case Rect: return asRect() == other.asRect();
        case Bitrate: return asBitrate() == other.asBitrate();
        case Pair: return asPair() == other.asPair();
        case MediaTime:
            return asMediaTime().value() == other.asMediaTime().value() &&
                   asMediaTime().timescale() == other.asMediaTime().timescale();
        default: return false;
    }
}

bool Any::operator<(const Any& other) const {
    if (type_ != other.type_) return type_ < other.type_;
    switch (type_) {
        case Int32: return asInt32() < other.asInt32();
        case Int64: return asInt64() < other.asInt64();
        case Float: return asFloat() < other.asFloat();
        case String: return before(narrow(*this), narrow(other));
        case WString: return before(wide(*this), wide(other));
        default: return false;
    }
}

bool Any::operator>(const Any& other) const { return type_ == other.type_ && other < *this; }

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

bool operator==(const Any& a, const char* b) {
    return a.isString() && b && std::strcmp(a.asString(), b) == 0;
}

bool operator==(const Any& a, const unsigned short* b) {
    if (!a.isWString() || !b) return false;
    const unsigned short* text = a.asWString();
    while (*text && *text == *b) ++text, ++b;
    return *text == *b;
}
