#include "builtin/kernels/lines/lines.h"
#include "builtin/kernels/lines/rows16.h"

namespace srk {

namespace {

size_t count(int n) { return static_cast<size_t>(n); }

constexpr FloatScale full = {0, 65535}, luma = {16 * 256, 219 * 256}, chroma = {128 * 256, 224 * 256};
constexpr FloatScale scalesBgra[4] = {full, full, full, full}, scalesVuya[4] = {chroma, chroma, luma, full};

}  // namespace

void unpackLine(const Format& format, const Byte* from, const Byte* chromaLine, const Line16& to, int width) {
    const auto& p = to.plane;
    const size_t n = count(width);
    uint16_t* const vuya[4] = {p[2], p[1], p[0], p[3]};
    switch (format.packing) {
        case Packing::words4: return splitWords4(from, p[0], p[1], p[2], p[3], n);
        case Packing::uyvaWords: return splitWords4(from, p[1], p[0], p[2], p[3], n);
        case Packing::uyvyWords: return splitWords422(from, p[0], p[1], p[2], n, false);
        case Packing::yuyvWords: return splitWords422(from, p[0], p[1], p[2], n, true);
        case Packing::v210: return splitV210(from, p[0], p[1], p[2], n);
        case Packing::v410: return splitTens(from, p[0], p[1], p[2], p[3], n, 2);
        case Packing::y410: return splitTens(from, p[0], p[1], p[2], p[3], n, 0);
        case Packing::nv16: raiseWords(p[0], from, n, 16); return splitWords2(chromaLine, p[1], p[2], n / 2);
        case Packing::floatRgb: return splitFloats(from, p, scalesBgra, n);
        case Packing::floatYuv: return splitFloats(from, vuya, scalesVuya, n);
        default: return;
    }
}

void packLine(const Format& format, const Line16& from, Byte* to, Byte* chromaLine, int width) {
    const auto& p = from.plane;
    const size_t n = count(width);
    const bool ten = format.sampleBits == 10;
    const uint16_t* const vuya[4] = {p[2], p[1], p[0], p[3]};
    switch (format.packing) {
        case Packing::words4: return joinWords4(to, p[0], p[1], p[2], p[3], n);
        case Packing::uyvaWords: return joinWords4(to, p[1], p[0], p[2], p[3], n);
        case Packing::uyvyWords: return joinWords422(to, p[0], p[1], p[2], n, false, ten);
        case Packing::yuyvWords: return joinWords422(to, p[0], p[1], p[2], n, true, ten);
        case Packing::v210: return joinV210(to, p[0], p[1], p[2], n);
        case Packing::v410: return joinTens(to, p[0], p[1], p[2], p[3], n, 2);
        case Packing::y410: return joinTens(to, p[0], p[1], p[2], p[3], n, 0);
        case Packing::nv16:
            roundWords(to, p[0], n, ten);
            return joinWords2(chromaLine, p[1], p[2], n / 2, ten);
        case Packing::floatRgb: return joinFloats(to, p, scalesBgra, n);
        case Packing::floatYuv: return joinFloats(to, vuya, scalesVuya, n);
        default: return;
    }
}

}  // namespace srk
