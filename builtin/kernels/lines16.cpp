#include <algorithm>
#include <bit>
#include <cmath>
#include <cstring>

#include "builtin/kernels/lines.h"

namespace srk {

namespace {

static_assert(std::endian::native == std::endian::little, "words of memory are read as they stand");

uint16_t wordAt(const Byte* from, int i) {
    uint16_t word;
    std::memcpy(&word, from + 2 * static_cast<std::ptrdiff_t>(i), 2);
    return word;
}
void putWord(Byte* to, int i, unsigned value) {
    const auto word = static_cast<uint16_t>(value);
    std::memcpy(to + 2 * static_cast<std::ptrdiff_t>(i), &word, 2);
}
uint32_t doubleAt(const Byte* from, int i) {
    uint32_t word;
    std::memcpy(&word, from + 4 * static_cast<std::ptrdiff_t>(i), 4);
    return word;
}
void putDouble(Byte* to, int i, uint32_t word) {
    std::memcpy(to + 4 * static_cast<std::ptrdiff_t>(i), &word, 4);
}

// Samples of 10 bits fill 16 with zeros below, and are rounded on the way back.
uint16_t raise10(uint32_t value) { return static_cast<uint16_t>((value & 1023) << 6); }
uint32_t lower10(unsigned value) { return std::min((value + 32) >> 6, 1023u); }

constexpr uint16_t opaque = 65535;
constexpr uint16_t neutral = 32768;

// Four words a pixel, in the order of the planes that they belong to.
void unpackFours(const Byte* from, const Line16& to, const int order[4], int width) {
    for (int k = 0; k < 4; ++k) {
        uint16_t* plane = to.plane[order[k]];
        if (!plane) continue;
        for (int i = 0; i < width; ++i) plane[i] = wordAt(from, 4 * i + k);
    }
}

void packFours(const Line16& from, Byte* to, const int order[4], int width) {
    for (int k = 0; k < 4; ++k) {
        const uint16_t* plane = from.plane[order[k]];
        for (int i = 0; i < width; ++i) putWord(to, 4 * i + k, plane ? plane[i] : opaque);
    }
}

// 4:2:2 by words: positions of luma and chroma in each group of four.
void unpackPairs(const Byte* from, const Line16& to, int luma, int width) {
    for (int i = 0; i < width; ++i) to.plane[0][i] = wordAt(from, 2 * i + luma);
    for (int i = 0; i < width / 2; ++i) {
        to.plane[1][i] = wordAt(from, 4 * i + 1 - luma);
        to.plane[2][i] = wordAt(from, 4 * i + 3 - luma);
    }
}

void packPairs(const Line16& from, Byte* to, int luma, int width, bool ten) {
    const auto fit = [ten](unsigned value) { return ten ? lower10(value) << 6 : value; };
    const int pairs = width / 2;
    for (int i = 0; i < width; ++i) putWord(to, 2 * i + luma, fit(from.plane[0][i]));
    for (int i = 0; i < pairs; ++i) {
        putWord(to, 4 * i + 1 - luma, fit(from.plane[1][i]));
        putWord(to, 4 * i + 3 - luma, fit(from.plane[2][i]));
    }
    if (width & 1) putWord(to, 4 * pairs + 1 - luma, fit(pairs ? from.plane[1][pairs - 1] : neutral));
}

// Six pixels: Cb Y Cr, Y Cb Y, Cr Y Cb, Y Cr Y, three samples of ten bits in a word, low bits first.
constexpr int groupPixels = 6, groupWords = 4;

void unpackV210(const Byte* from, const Line16& to, int width) {
    for (int x = 0; x < width; x += groupPixels) {
        uint16_t s[12];
        for (int w = 0; w < groupWords; ++w) {
            const uint32_t word = doubleAt(from, x / groupPixels * groupWords + w);
            for (int k = 0; k < 3; ++k) s[3 * w + k] = raise10(word >> 10 * k);
        }
        const int pixels = std::min(groupPixels, width - x),
                  pairs = (std::min(width, x + groupPixels) - x) / 2;
        for (int i = 0; i < pixels; ++i) to.plane[0][x + i] = s[2 * i + 1];
        for (int i = 0; i < pairs; ++i) {
            to.plane[1][x / 2 + i] = s[4 * i];
            to.plane[2][x / 2 + i] = s[4 * i + 2];
        }
    }
}

void packV210(const Line16& from, Byte* to, int width) {
    const int pairs = width / 2;
    for (int x = 0; x < width; x += groupPixels) {
        uint32_t s[12] = {};
        const int pixels = std::min(groupPixels, width - x);
        for (int i = 0; i < pixels; ++i) s[2 * i + 1] = lower10(from.plane[0][x + i]);
        for (int i = 0; i < (pixels + 1) / 2; ++i) {
            const int at = std::min(x / 2 + i, pairs - 1);
            s[4 * i] = lower10(at < 0 ? neutral : from.plane[1][at]);
            s[4 * i + 2] = lower10(at < 0 ? neutral : from.plane[2][at]);
        }
        for (int w = 0; w < groupWords; ++w)
            putDouble(to, x / groupPixels * groupWords + w,
                      s[3 * w] | s[3 * w + 1] << 10 | s[3 * w + 2] << 20);
    }
}

// U, Y, V of ten bits from bit `low` up; two bits of alpha in Y410.
void unpackTens(const Byte* from, const Line16& to, int low, int width) {
    for (int i = 0; i < width; ++i) {
        const uint32_t word = doubleAt(from, i);
        to.plane[1][i] = raise10(word >> low);
        to.plane[0][i] = raise10(word >> (low + 10));
        to.plane[2][i] = raise10(word >> (low + 20));
        if (low == 0 && to.plane[3]) to.plane[3][i] = static_cast<uint16_t>((word >> 30) * 0x5555);
    }
}

void packTens(const Line16& from, Byte* to, int low, int width) {
    for (int i = 0; i < width; ++i) {
        const uint32_t sum =
            lower10(from.plane[1][i]) | lower10(from.plane[0][i]) << 10 | lower10(from.plane[2][i]) << 20;
        const uint32_t alpha = from.plane[3] ? (from.plane[3][i] * 3u + 32767) / 65535 : 3;
        putDouble(to, i, low ? sum << low : sum | alpha << 30);
    }
}

void unpackNv(const Byte* luma, const Byte* chroma, const Line16& to, int width) {
    std::memcpy(to.plane[0], luma, 2 * static_cast<size_t>(width));
    for (int i = 0; i < width / 2; ++i) {
        to.plane[1][i] = wordAt(chroma, 2 * i);
        to.plane[2][i] = wordAt(chroma, 2 * i + 1);
    }
}

void packNv(const Line16& from, Byte* luma, Byte* chroma, int width, bool ten) {
    const auto fit = [ten](unsigned value) { return ten ? lower10(value) << 6 : value; };
    for (int i = 0; i < width; ++i) putWord(luma, i, fit(from.plane[0][i]));
    for (int i = 0; i < width / 2; ++i) {
        putWord(chroma, 2 * i, fit(from.plane[1][i]));
        putWord(chroma, 2 * i + 1, fit(from.plane[2][i]));
    }
}

// A float to its sample: 0 stands at `zero`, 1 at `zero + span`. Not a number is 0.
struct Scale {
    float zero, span;
};
constexpr Scale full = {0, 65535}, luma = {16 * 256, 219 * 256}, chroma = {128 * 256, 224 * 256};

struct FloatOrder {
    int plane[4];
    Scale scale[4];
};
constexpr FloatOrder floatBgra = {{0, 1, 2, 3}, {full, full, full, full}};
constexpr FloatOrder floatVuya = {{2, 1, 0, 3}, {chroma, chroma, luma, full}};

void unpackFloats(const Byte* from, const Line16& to, const FloatOrder& order, int width) {
    for (int k = 0; k < 4; ++k) {
        uint16_t* plane = to.plane[order.plane[k]];
        if (!plane) continue;
        const Scale s = order.scale[k];
        for (int i = 0; i < width; ++i) {
            const float value = std::bit_cast<float>(doubleAt(from, 4 * i + k)) * s.span + s.zero + 0.5f;
            plane[i] = static_cast<uint16_t>(value >= 0 ? std::min(value, 65535.0f) : 0.0f);
        }
    }
}

void packFloats(const Line16& from, Byte* to, const FloatOrder& order, int width) {
    for (int k = 0; k < 4; ++k) {
        const uint16_t* plane = from.plane[order.plane[k]];
        const Scale s = order.scale[k];
        for (int i = 0; i < width; ++i) {
            const float value = plane ? (static_cast<float>(plane[i]) - s.zero) / s.span : 1.0f;
            putDouble(to, 4 * i + k, std::bit_cast<uint32_t>(value));
        }
    }
}

constexpr int orderBgra[4] = {0, 1, 2, 3}, orderUyva[4] = {1, 0, 2, 3};

}  // namespace

void unpackLine(const Format& format, const Byte* from, const Byte* chromaLine, const Line16& to, int width) {
    switch (format.packing) {
        case Packing::words4: return unpackFours(from, to, orderBgra, width);
        case Packing::uyvaWords: return unpackFours(from, to, orderUyva, width);
        case Packing::uyvyWords: return unpackPairs(from, to, 1, width);
        case Packing::yuyvWords: return unpackPairs(from, to, 0, width);
        case Packing::v210: return unpackV210(from, to, width);
        case Packing::v410: return unpackTens(from, to, 2, width);
        case Packing::y410: return unpackTens(from, to, 0, width);
        case Packing::nv16: return unpackNv(from, chromaLine, to, width);
        case Packing::floatRgb: return unpackFloats(from, to, floatBgra, width);
        case Packing::floatYuv: return unpackFloats(from, to, floatVuya, width);
        default: return;
    }
}

void packLine(const Format& format, const Line16& from, Byte* to, Byte* chromaLine, int width) {
    const bool ten = format.sampleBits == 10;
    switch (format.packing) {
        case Packing::words4: return packFours(from, to, orderBgra, width);
        case Packing::uyvaWords: return packFours(from, to, orderUyva, width);
        case Packing::uyvyWords: return packPairs(from, to, 1, width, ten);
        case Packing::yuyvWords: return packPairs(from, to, 0, width, ten);
        case Packing::v210: return packV210(from, to, width);
        case Packing::v410: return packTens(from, to, 2, width);
        case Packing::y410: return packTens(from, to, 0, width);
        case Packing::nv16: return packNv(from, to, chromaLine, width, ten);
        case Packing::floatRgb: return packFloats(from, to, floatBgra, width);
        case Packing::floatYuv: return packFloats(from, to, floatVuya, width);
        default: return;
    }
}

void raiseWords(uint16_t* to, const Byte* from, int n, int depth) {
    const int shift = 16 - depth;
    for (int i = 0; i < n; ++i) to[i] = static_cast<uint16_t>(wordAt(from, i) << shift);
}

void lowerWords(Byte* to, const uint16_t* from, int n, int depth) {
    const int shift = 16 - depth;
    const unsigned half = shift ? 1u << (shift - 1) : 0, most = 65535u >> shift;
    for (int i = 0; i < n; ++i) putWord(to, i, std::min((from[i] + half) >> shift, most));
}

}  // namespace srk
