#include "core/value/anycompare_p.h"

#include <algorithm>
#include <cstring>
#include <span>

#include "core/measure/qvgeometry.h"
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

bool qvSameContents(const Any& a, const Any& b) {
    switch (a.type()) {
        case Any::Invalid: return true;
        case Any::Int32: return a.asInt32() == b.asInt32();
        case Any::Int64: return a.asInt64() == b.asInt64();
        case Any::Float: return a.asFloat() == b.asFloat();  // false for NaN, true for 0.0 and -0.0
        case Any::String: return same(narrow(a), narrow(b));
        case Any::WString: return same(wide(a), wide(b));
        case Any::Dict: return a.asDict() == b.asDict();
        case Any::Vector: return a.asVector() == b.asVector();
        case Any::Generic:
            return a.asGeneric() == b.asGeneric() ||
                   (a.size() > 0 &&
                    std::memcmp(a.asGeneric(), b.asGeneric(), static_cast<std::size_t>(a.size())) == 0);
        case Any::Framerate: return a.asFramerate() == b.asFramerate();
        case Any::Point: return a.asPoint() == b.asPoint();
        case Any::Rect: return a.asRect() == b.asRect();
        case Any::Bitrate: return a.asBitrate() == b.asBitrate();
        case Any::Pair: return a.asPair() == b.asPair();
        case Any::MediaTime:
            return a.asMediaTime().value() == b.asMediaTime().value() &&
                   a.asMediaTime().timescale() == b.asMediaTime().timescale();
        default: return false;
    }
}

bool qvAnyBefore(const Any& a, const Any& b) {
    if (a.type() != b.type()) return a.type() < b.type();
    switch (a.type()) {
        case Any::Int32: return a.asInt32() < b.asInt32();
        case Any::Int64: return a.asInt64() < b.asInt64();
        case Any::Float: return a.asFloat() < b.asFloat();
        case Any::String: return before(narrow(a), narrow(b));
        case Any::WString: return before(wide(a), wide(b));
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
