// The pixel formats of the whole system, each named by its FOURCC.
#pragma once

#include <array>
#include <span>
#include <string>

#include "core/arch/api.h"

// A FOURCC is a 32-bit integer whose bytes in memory, low byte first, are the characters of the code:
// qvFourcc("BGRA") is 0x41524742.
constexpr unsigned qvFourcc(const char (&code)[5]) {
    unsigned value = 0;
    for (int i = 3; i >= 0; --i) value = value << 8 | static_cast<unsigned char>(code[i]);
    return value;
}

namespace QvFourcc {
constexpr unsigned GRAY = qvFourcc("GRAY");
constexpr unsigned I420 = qvFourcc("I420");
constexpr unsigned YV12 = qvFourcc("YV12");
constexpr unsigned I422 = qvFourcc("I422");
constexpr unsigned W016 = qvFourcc("W016");
constexpr unsigned YUY2 = qvFourcc("YUY2");
constexpr unsigned YUYV = qvFourcc("YUYV");
constexpr unsigned UYVY = qvFourcc("UYVY");
constexpr unsigned Y216 = qvFourcc("Y216");
constexpr unsigned v210 = qvFourcc("v210");
constexpr unsigned BGR3 = qvFourcc("BGR3");
constexpr unsigned BGR4 = qvFourcc("BGR4");
constexpr unsigned BGRA = qvFourcc("BGRA");
constexpr unsigned ARGB = qvFourcc("ARGB");
constexpr unsigned R32C = qvFourcc("R32C");
constexpr unsigned b64a = qvFourcc("b64a");
constexpr unsigned R555 = qvFourcc("R555");
constexpr unsigned R565 = qvFourcc("R565");
}  // namespace QvFourcc

// How the chroma of a planar format lies: planes 1 and 2 are U and V.
enum class QvChroma : unsigned char {
    none,    // one plane
    half,    // half the columns, all rows
    quarter  // half the columns, half the rows
};

// One row of the format table.
struct QvPixelFormat {
    unsigned fourcc;
    QvChroma chroma;
    bool rgb;                   // as QvFrame::isRGB answers
    unsigned char sampleBytes;  // 2 for formats of 16-bit samples, else 1
    signed char pixelBytes;     // of each plane; -1 where a pixel has no whole number (v210)
    signed char bitsPerPixel;   // -1: not defined
    signed char bitDepth;
    char group;  // formats of one letter differ in their label or byte order only; 0 for none

    constexpr int planes() const { return chroma == QvChroma::none ? 1 : 3; }
};

// All formats.
QV_API std::span<const QvPixelFormat> qvPixelFormats();

// The row of a format, or null for an unknown FOURCC.
QV_API const QvPixelFormat* qvPixelFormat(unsigned fourcc);

// The default stride of plane 0 in bytes.
QV_API long long qvDefaultStride(const QvPixelFormat& format, int width);

// The four characters with a terminating zero.
constexpr std::array<char, 5> qvFourccText(unsigned fourcc) {
    const auto at = [fourcc](int i) { return static_cast<char>(fourcc >> 8 * i & 255); };
    return {at(0), at(1), at(2), at(3), 0};
}

// Equal, or BGRA with BGR4, or YUY2 with YUYV.
QV_API bool qvEqualFourcc(unsigned a, unsigned b);

// Both among BGRA, ARGB, BGR4, R32C; or YUYV, YUY2, UYVY; or I420, YV12.
QV_API bool qvExchangeableFourcc(unsigned a, unsigned b);
