// The one entry point of picture conversion: any of 38 pixel formats to any other, while scaling.
//
//     SRScaler(0, qvFourcc("YUYV"), from, 0, 1920, 1080, qvFourcc("I420"), to, 0, 1920, 1080, 0,
//              QvScale::standard, nullptr);
//
// Formats by FOURCC, words in the machine's order:
//     BGRA BGR4 BGR3             bytes B, G, R and alpha, a spare byte, or nothing
//     R32A R32C R24C             the same at video levels: black 16, white 235
//     R565 R555                  a word, blue in the low five bits
//     B64A (b64a) R64A           words B, G, R, A; R64A at video levels
//     VUYA VUY4                  bytes V, U, Y and alpha or a spare byte
//     YUYV (YUNV YUY2) UYVY (UYNV, and HDYC, which is always BT.709)
//     I444 I422 I411 I420        planes Y, U, V
//     YV24 YV16 YV12 YVU9        planes Y, V, U; YVU9 has one chroma sample for 4 x 4 pixels
//     GRAY Y16                   luma alone; others see neutral chroma
//     v210                       six pixels in four little-endian double words
//     v216 Y216 Y210             words U Y V Y, and Y U Y V twice, 10 bits of Y210 in the high end
//     v410 Y410 Y416             Y410: U Y V of 10 bits and 2 of alpha; v410: the same, up by two bits; words
//     P210 P216                  plane Y, plane of U V pairs; 10 bits of P210 in the high end
//     W009..W016 W209..W216 W409..W416  planes Y, U, V of words, 9 to 16 bits in the low end: 4:2:0 4:2:2
//                                4:4:4
//     B32F Y32F                  floats B, G, R, A from 0 to 1; floats V, U, Y, A, chroma from -0.5 to 0.5
// Alpha is kept between formats that have it, but that of BGRA, R32A and VUYA only for a target of the same
// format: any other sees these as BGR4, R32C and VUY4. It is dropped, not applied, and opaque where it is
// new. Subsampled planes have width / factor by height / factor samples, rounded down. Chroma lies on the
// left pixel of its pair, and in 4:2:0 between its two lines (of a field, if interlaced); of YVU9 in the
// middle.
#pragma once

#include "core/arch/api.h"

// Planes that need not be adjacent in memory. The FOURCC "EXT1" stands for a pointer to this record; its
// size and strides count then, and those of the call are not read.
struct QvScalePicture {
    unsigned tag;     // qvFourcc("EXT1")
    unsigned fourcc;  // the real one
    int width, height;
    int stride, stride1, stride2;  // bytes from a line to the next, also negative; 0: as the format has it
    unsigned char* planes[3];      // in the format's order
};

namespace QvScale {

// Mode.
constexpr unsigned cropSource = 1;         // the source rectangle counts
constexpr unsigned oneThread = 2;          // all work on the caller's thread
constexpr unsigned placeTarget = 0x10000;  // the target rectangle counts

// Flags.
constexpr unsigned nearest = 0;   // takes the nearest pixel
constexpr unsigned high = 1;      // windowed sinc of eight taps, at eighths of a pixel
constexpr unsigned standard = 2;  // cubic; chroma of a picture that keeps its size is interpolated linearly
constexpr unsigned kindMask = 15;
constexpr unsigned clip = 0x10;         // no scaling: the common part of both pictures from the top left
constexpr unsigned interlaced = 0x100;  // lines alternate between two fields, which are never mixed
constexpr unsigned keepLeft = 0x1000, keepRight = 0x2000;  // which edge samples meet exactly, with a crop;
constexpr unsigned keepTop = 0x4000, keepBottom = 0x8000;  // default: their centres lie evenly
constexpr unsigned source601 = 1u << 24, source709 = 1u << 25;  // without either: BT.601
constexpr unsigned target601 = 1u << 28, target709 = 1u << 29;

}  // namespace QvScale

// Converts `source` into `target`. Both point to the first pixel of the top line, or to a QvScalePicture.
// A stride of 0 means the format's own; planes then, and with any other positive stride, follow one
// another, and chroma strides are the luma stride through the horizontal factor. Negative strides walk
// upwards; with several planes they need a QvScalePicture. `rectangles`: source left, top, right, bottom in
// 1/256 of a pixel, from centre to centre of the outermost pixels (right left of left mirrors), then target
// left, top, right, bottom in pixels, the last ones included; null: the whole pictures. Target samples
// outside of the rectangle stay. The target may be the source where both have lines of the same place and
// length and nothing is scaled; they must not overlap otherwise.
//
// 1, or 0 with the target untouched: an unknown FOURCC, a size or a rectangle without pixels, a rectangle
// beyond the target, a null pointer, or a stride shorter than a line. Any thread may call at any time. The
// work is shared with the engine's thread pool unless the mode forbids it; memory is taken when a new kind of
// conversion is met, not for each picture. std::bad_alloc without memory. `reserved` is 0.
QV_API int SRScaler(unsigned mode, unsigned sourceFourcc, const void* source, int sourceStride,
                    int sourceWidth, int sourceHeight, unsigned targetFourcc, void* target, int targetStride,
                    int targetWidth, int targetHeight, long long reserved, unsigned flags,
                    const int* rectangles);
