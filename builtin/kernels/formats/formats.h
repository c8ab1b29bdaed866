// The pixel formats that the scaler knows, their traits and how their planes lie in memory.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

namespace srk {

using Byte = unsigned char;

// What the samples mean. Luma alone converts as YUV with neutral chroma.
enum class Family : uint8_t { rgb, video, yuv };  // video: RGB from 16 to 235

// How a line is made of samples: which pair of kernels reads and writes it.
enum class Packing : uint8_t {
    bytes4,
    bytes3,
    rgb565,
    rgb555,
    words4,
    vuya,
    yuyv,
    uyvy,
    planar8,
    planar16,
    nv16,
    v210,
    uyvyWords,
    yuyvWords,
    v410,
    y410,
    uyvaWords,
    floatRgb,
    floatYuv
};

// Format flags.
enum : uint32_t {
    deepSamples = 1u << 3,  // worked on as 16-bit samples
    videoLevels = 1u << 4,
    hasAlpha = 1u << 5,
    isRgb = 1u << 6,
    isYuv = 1u << 7,
    packed422 = 1u << 8,
    halfWide = 1u << 16,
    halfWideBetween = 3u << 16,
    quarterWide = 1u << 18,
    quarterWideBetween = 3u << 18,
    halfHigh = 1u << 20,
    halfHighBetween = 3u << 20,
    quarterHigh = 1u << 22,
    quarterHighBetween = 3u << 22,
    uBeforeV = 1u << 25,
    lumaOnly = 1u << 26,
};

struct Format {
    char name[5];
    uint8_t sampleBits;  // of the code value
    uint8_t bits;        // of a pixel, or of a sample of a plane
    Packing packing;
    uint32_t flags;

    constexpr bool has(uint32_t bit) const { return (flags & bit) == bit; }
    constexpr bool deep() const { return has(deepSamples); }
    constexpr bool alpha() const { return has(hasAlpha); }
    constexpr Family family() const {
        return has(isYuv) ? Family::yuv : has(videoLevels) ? Family::video : Family::rgb;
    }
    constexpr bool planar() const { return packing == Packing::planar8 || packing == Packing::planar16; }
    constexpr int planes() const {
        if (packing == Packing::nv16) return 2;
        return planar() && !has(lumaOnly) ? 3 : 1;
    }
    // Luma samples for one chroma sample, across and down.
    constexpr int across() const { return has(quarterWide) ? 4 : has(halfWide) ? 2 : 1; }
    constexpr int down() const { return has(quarterHigh) ? 4 : has(halfHigh) ? 2 : 1; }
    // Where the first chroma sample lies, in luma pixels.
    constexpr double acrossOffset() const {
        return has(quarterWideBetween) ? 1.5 : has(halfWideBetween) ? 0.5 : 0;
    }
    constexpr double downOffset() const {
        return has(quarterHighBetween) ? 1.5 : has(halfHighBetween) ? 0.5 : 0;
    }
};

constexpr int formatCount = 38;
std::span<const Format, formatCount> formats();

// The number of a format, with the bits of a sample in the high 16 bits for the W family; -1: unknown.
int formatNumber(uint32_t fourcc);

struct Plane {
    Byte* data = nullptr;
    std::ptrdiff_t stride = 0;
};

// A picture in memory. Planes stand in the order Y, U, V whatever their order in memory.
struct Picture {
    const Format* format = nullptr;
    int number = 0;
    int depth = 16;  // bits of a sample of the W family
    int width = 0, height = 0;
    Plane planes[3];

    int planeWidth(int plane) const { return plane ? width / format->across() : width; }
    int planeHeight(int plane) const { return plane ? height / format->down() : height; }
};

// The bytes that a line of plane 0 or of a chroma plane really takes, and the stride that a format has by
// itself.
long long lineBytes(const Format& format, int width, int plane);
long long naturalStride(const Format& format, int width);

// Fills the planes of `picture`, whose format and size are set, from one block. False: the stride does not
// serve.
bool layOut(Picture& picture, Byte* base, long long stride);
// The same for planes of their own, in the format's order.
bool layOut(Picture& picture, Byte* const planes[3], const int strides[3]);

}  // namespace srk
