#include <cstring>

#include "builtin/kernels/lines.h"
#include "builtin/kernels/rows8.h"

namespace srk {

namespace {

size_t count(int n) { return static_cast<size_t>(n); }

// Fields of 5 and 6 bits spread over 8 by repeating their upper bits.
Byte five(unsigned value) { return static_cast<Byte>((value & 31) << 3 | (value & 31) >> 2); }
Byte six(unsigned value) { return static_cast<Byte>((value & 63) << 2 | (value & 63) >> 4); }

// round(value * most / 255)
unsigned toBits(unsigned value, unsigned most) { return (value * most + 127) / 255; }

template <bool green6>
void unpackWord(const Byte* from, const Line8& to, int width) {
    for (int i = 0; i < width; ++i) {
        uint16_t word;
        std::memcpy(&word, from + 2 * i, 2);
        to.plane[0][i] = five(word);
        to.plane[1][i] = green6 ? six(word >> 5u) : five(word >> 5u);
        to.plane[2][i] = five(word >> (green6 ? 11u : 10u));
    }
}

template <bool green6>
void packWord(const Line8& from, Byte* to, int width) {
    for (int i = 0; i < width; ++i) {
        const unsigned green = toBits(from.plane[1][i], green6 ? 63 : 31) << 5;
        const unsigned red = toBits(from.plane[2][i], 31) << (green6 ? 11 : 10);
        const auto word = static_cast<uint16_t>(toBits(from.plane[0][i], 31) | green | red);
        std::memcpy(to + 2 * i, &word, 2);
    }
}

}  // namespace

void unpackLine(const Format& format, const Byte* from, const Line8& to, int width) {
    const auto& p = to.plane;
    const size_t n = count(width);
    switch (format.packing) {
        case Packing::bytes4: return split4(from, p[0], p[1], p[2], format.alpha() ? p[3] : nullptr, n);
        case Packing::bytes3: return split3(from, p[0], p[1], p[2], n);
        case Packing::vuya: return split4(from, p[2], p[1], p[0], format.alpha() ? p[3] : nullptr, n);
        case Packing::yuyv: return splitYuyv(from, p[0], p[1], p[2], n, true);
        case Packing::uyvy: return splitYuyv(from, p[0], p[1], p[2], n, false);
        case Packing::rgb565: return unpackWord<true>(from, to, width);
        case Packing::rgb555: return unpackWord<false>(from, to, width);
        default: return;
    }
}

void packLine(const Format& format, const Line8& from, Byte* to, int width) {
    const auto& p = from.plane;
    const size_t n = count(width);
    switch (format.packing) {
        case Packing::bytes4: return join4(to, p[0], p[1], p[2], format.alpha() ? p[3] : nullptr, n);
        case Packing::bytes3: return join3(to, p[0], p[1], p[2], n);
        case Packing::vuya: return join4(to, p[2], p[1], p[0], format.alpha() ? p[3] : nullptr, n);
        case Packing::yuyv: return joinYuyv(to, p[0], p[1], p[2], n, true);
        case Packing::uyvy: return joinYuyv(to, p[0], p[1], p[2], n, false);
        case Packing::rgb565: return packWord<true>(from, to, width);
        case Packing::rgb555: return packWord<false>(from, to, width);
        default: return;
    }
}

}  // namespace srk
