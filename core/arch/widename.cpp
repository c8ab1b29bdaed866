#include "core/arch/widename.h"

#include <cstdint>

namespace {

constexpr unsigned escapeBase = 0xDC00;

bool isEscape(unsigned unit) { return unit >= escapeBase + 0x80 && unit <= escapeBase + 0xFF; }
bool isHigh(unsigned unit) { return unit >= 0xD800 && unit <= 0xDBFF; }
bool isLow(unsigned unit) { return unit >= 0xDC00 && unit <= 0xDFFF; }

void appendUtf8(std::string& out, unsigned point) {
    const auto byte = [&](unsigned value) { out.push_back(static_cast<char>(value)); };
    if (point < 0x80) {
        byte(point);
    } else if (point < 0x800) {
        byte(0xC0 | point >> 6);
        byte(0x80 | (point & 0x3F));
    } else if (point < 0x10000) {
        byte(0xE0 | point >> 12);
        byte(0x80 | (point >> 6 & 0x3F));
        byte(0x80 | (point & 0x3F));
    } else {
        byte(0xF0 | point >> 18);
        byte(0x80 | (point >> 12 & 0x3F));
        byte(0x80 | (point >> 6 & 0x3F));
        byte(0x80 | (point & 0x3F));
    }
}

struct Decoded {
    unsigned point;
    std::size_t length;  // 0: not valid UTF-8
};

// Refuses overlong forms, surrogates and values above U+10FFFF: each would break the way back.
Decoded decodeUtf8(std::string_view bytes) {
    const auto at = [&](std::size_t i) { return static_cast<unsigned char>(bytes[i]); };
    const unsigned lead = at(0);
    if (lead < 0x80) return {lead, 1};
    const std::size_t length = lead >= 0xF0 ? 4 : lead >= 0xE0 ? 3 : 2;
    if (lead < 0xC2 || lead > 0xF4 || bytes.size() < length) return {0, 0};
    unsigned point = lead & (0x7Fu >> length);
    for (std::size_t i = 1; i < length; ++i) {
        if ((at(i) & 0xC0) != 0x80) return {0, 0};
        point = point << 6 | (at(i) & 0x3Fu);
    }
    constexpr unsigned smallest[] = {0, 0, 0x80, 0x800, 0x10000};
    const bool surrogate = isHigh(point) || isLow(point);
    if (point < smallest[length] || point > 0x10FFFF || surrogate) return {0, 0};
    return {point, length};
}

}  // namespace

std::string qv_narrow_name(const unsigned short* units, std::size_t count) {
    std::string out;
    out.reserve(count);
    for (std::size_t i = 0; i < count; ++i) {
        const unsigned unit = units[i];
        if (isHigh(unit) && i + 1 < count && isLow(units[i + 1])) {
            appendUtf8(out, 0x10000 + ((unit - 0xD800) << 10) + (units[++i] - 0xDC00u));
        } else if (isEscape(unit)) {
            out.push_back(static_cast<char>(unit - escapeBase));
        } else {
            appendUtf8(out, unit);
        }
    }
    return out;
}

QvWideString qv_wide_name(std::string_view bytes) {
    QvWideString out;
    out.reserve(bytes.size());
    const auto unit = [&](unsigned value) { out.push_back(static_cast<unsigned short>(value)); };
    while (!bytes.empty()) {
        const Decoded decoded = decodeUtf8(bytes);
        if (decoded.length == 0) {
            unit(escapeBase + static_cast<unsigned char>(bytes.front()));
            bytes.remove_prefix(1);
            continue;
        }
        if (decoded.point >= 0x10000) {
            unit(0xD800 + ((decoded.point - 0x10000) >> 10));
            unit(0xDC00 + ((decoded.point - 0x10000) & 0x3FF));
        } else {
            unit(decoded.point);
        }
        bytes.remove_prefix(decoded.length);
    }
    return out;
}
