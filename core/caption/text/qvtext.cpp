#include "core/caption/text/qvtext.h"

#include <algorithm>
#include <cstddef>
#include <cstring>
#include <span>

#include "core/arch/platform.h"
#include "core/caption/text/fontface_p.h"
#include "core/engine/facts/codepages.h"
#include "core/engine/files/qvfileutil.h"
#include "core/engine/status.h"
#include "core/value/utf.h"

namespace {

constexpr struct {
    int identifier;
    const char* name;
} unicodeEncodings[] = {
    {QvText::utf32, "UTF-32"},
    {QvText::utf16, "UTF-16"},
    {QvText::utf8, "UTF-8"},
    {QvText::bytes, "ASCII"},
};

// The whole units of a text before its first zero unit. Nothing is assumed about alignment.
template <class Unit>
std::basic_string<Unit> units(std::string_view text) {
    std::basic_string<Unit> found(text.size() / sizeof(Unit), Unit{});
    std::memcpy(found.data(), text.data(), found.size() * sizeof(Unit));
    found.resize(std::min(found.find(Unit{}), found.size()));
    return found;
}

template <class Unit>
std::size_t lengthOf(const Unit* text) {
    std::size_t length = 0;
    while (text[length] != 0) ++length;
    return length;
}

// Bytes before the terminator, which may have any alignment.
template <class Unit>
std::size_t bytesBeforeZero(const char* text) {
    for (std::size_t at = 0;; at += sizeof(Unit)) {
        Unit unit;
        std::memcpy(&unit, text + at, sizeof unit);
        if (unit == 0) return at;
    }
}

template <class Units>
std::u32string decoded(Units text) {
    std::u32string out;
    out.reserve(text.size());
    for (std::size_t at = 0; at < text.size();) out += QvUtf::next(text, at);
    return out;
}

std::u32string fromUtf8(std::string_view text) { return decoded(text.substr(0, text.find('\0'))); }

std::u32string fromUtf16(std::string_view text) {
    const auto found = units<unsigned short>(text);
    return decoded(std::span<const unsigned short>(found));
}

std::u32string fromBytes(std::string_view text) {
    std::u32string out;
    for (const char c : text.substr(0, text.find('\0'))) out += static_cast<unsigned char>(c);
    return out;
}

std::u32string fromCodepage(std::string_view text, int number) {
    text = text.substr(0, text.find('\0'));
    std::u32string out;
    if (qv_platform().decodeCodepage(number, text, out)) return out;
    out.clear();
    for (const char c : text)
        out += static_cast<unsigned char>(c) < 0x80 ? static_cast<char32_t>(c) : QvUtf::replacement;
    return out;
}

int putUnits(std::u32string_view text, unsigned* out) {
    *std::copy(text.begin(), text.end(), out) = 0;
    return static_cast<int>(text.size());
}

}  // namespace

std::u32string QvText::toUtf32(std::string_view text, int encoding) {
    switch (encoding) {
        case bytes: return fromBytes(text);
        case utf8: return fromUtf8(text);
        case utf16: return fromUtf16(text);
        case utf32: return units<char32_t>(text);
        default: return fromCodepage(text, encoding);
    }
}

std::string QvText::toUtf8(std::u32string_view text) {
    std::string out;
    out.reserve(text.size());
    for (const char32_t c : text.substr(0, text.find(U'\0'))) QvUtf::append(out, c);
    return out;
}

int QvText::utf8ToUtf32(const char* text, unsigned* out) { return putUnits(fromUtf8(text), out); }

int QvText::utf16ToUtf32(const unsigned short* text, unsigned* out) {
    return putUnits(decoded(std::span<const unsigned short>(text, lengthOf(text))), out);
}

int QvText::utf32ToUtf8(const unsigned* text, char* out) {
    std::string utf8Text;
    for (; *text; ++text) QvUtf::append(utf8Text, static_cast<char32_t>(*text));
    std::memcpy(out, utf8Text.c_str(), utf8Text.size() + 1);
    return static_cast<int>(utf8Text.size());
}

int QvText::encodingToUtf32(const char* text, int encoding, unsigned* out) {
    std::size_t length = 0;
    switch (encoding) {
        case utf16: length = bytesBeforeZero<unsigned short>(text); break;
        case utf32: length = bytesBeforeZero<unsigned>(text); break;
        default: length = std::strlen(text); break;
    }
    return putUnits(toUtf32({text, length}, encoding), out);
}

int QvText::utf8ToWchar(const Any& text, Any& out) {
    out = text.toWString();
    return out.isValid() ? QvStatus::ok : QvStatus::failed;
}

int QvText::wcharToUtf8(const Any& text, Any& out) {
    out = text.toString();
    return out.isValid() ? QvStatus::ok : QvStatus::failed;
}

void QvText::availableEncodings(AnyVector& out) {
    AnyVector pages;
    available_codepages(pages);
    out.clear();
    for (const auto& encoding : unicodeEncodings)
        out.append(AnyDict("name", encoding.name, "identifier", encoding.identifier));
    out.extend(pages);
}

Any QvText::encodingName(int identifier) {
    AnyVector all;
    availableEncodings(all);
    for (const Any& encoding : all)
        if (encoding.asDict().getInt32("identifier", -1) == identifier) return encoding.asDict()["name"];
    return "N/A";
}

bool QvText::isFont(const Any& file) {
    constexpr int anySize = 32;
    FontLibrary library;
    FontFace face;
    if (library.get()) face.load(library, file, anySize);
    return face.usable();
}

Any QvText::cliEscape(const Any& text) { return QvFile::shellQuote(text); }
