#include "builtin/kernels/formats/formats.h"

#include <cstring>

#include "core/measure/fourcc.h"

namespace srk {

namespace {

using enum Packing;

constexpr uint32_t rgb = isRgb, vid = isRgb | videoLevels, yuv = isYuv | uBeforeV, yvu = isYuv;
constexpr uint32_t deep = deepSamples, alpha = hasAlpha;
constexpr uint32_t c422 = halfWide, c420 = halfWide | halfHighBetween, c411 = quarterWide;
constexpr uint32_t c410 = quarterWideBetween | quarterHighBetween;

// clang-format off
constexpr Format table[] = {
    {"BGRA",  8,  32, bytes4,    rgb | alpha},
    {"BGR4",  8,  32, bytes4,    rgb},
    {"BGR3",  8,  24, bytes3,    rgb},
    {"R32A",  8,  32, bytes4,    vid | alpha},
    {"R32C",  8,  32, bytes4,    vid},
    {"R24C",  8,  24, bytes3,    vid},
    {"R565",  8,  16, rgb565,    rgb},
    {"R555",  8,  16, rgb555,    rgb},
    {"B64A", 16,  64, words4,    rgb | alpha | deep},
    {"R64A", 16,  64, words4,    vid | alpha | deep},
    {"VUYA",  8,  32, vuya,      yuv | alpha},
    {"VUY4",  8,  32, vuya,      yuv},
    {"YUYV",  8,  16, yuyv,      yuv | c422 | packed422},
    {"UYVY",  8,  16, uyvy,      yuv | c422 | packed422},
    {"I444",  8,   8, planar8,   yuv},
    {"I422",  8,   8, planar8,   yuv | c422},
    {"I411",  8,   8, planar8,   yuv | c411},
    {"I420",  8,   8, planar8,   yuv | c420},
    {"YV24",  8,   8, planar8,   yvu},
    {"YV16",  8,   8, planar8,   yvu | c422},
    {"YV12",  8,   8, planar8,   yvu | c420},
    {"YVU9",  8,   8, planar8,   yvu | c410},
    {"GRAY",  8,   8, planar8,   yuv | lumaOnly},
    {"Y16",  16,  16, planar16,  yuv | lumaOnly | deep},
    {"v210", 10,  32, v210,      yuv | c422 | packed422 | deep},
    {"v216", 16,  64, uyvyWords, yuv | c422 | packed422 | deep},
    {"v410", 10,  32, v410,      yuv | deep},
    {"P210", 10,  16, nv16,      yuv | c422 | deep},
    {"P216", 16,  16, nv16,      yuv | c422 | deep},
    {"Y210", 10,  32, yuyvWords, yuv | c422 | packed422 | deep},
    {"Y216", 16,  32, yuyvWords, yuv | c422 | packed422 | deep},
    {"Y410", 10,  32, y410,      yuv | alpha | deep},
    {"Y416", 16,  64, uyvaWords, yuv | alpha | deep},
    {"W0XX", 16,  16, planar16,  yuv | c420 | deep},
    {"W2XX", 16,  16, planar16,  yuv | c422 | deep},
    {"W4XX", 16,  16, planar16,  yuv | deep},
    {"B32F", 32, 128, floatRgb,  rgb | alpha | deep},
    {"Y32F", 32, 128, floatYuv,  yuv | alpha | deep},
};
// clang-format on
static_assert(std::size(table) == formatCount);

constexpr int numberOf(const char* name) {
    for (int i = 0; i < formatCount; ++i) {
        int k = 0;
        while (name[k] && table[i].name[k] == name[k]) ++k;
        if (!name[k] && !table[i].name[k]) return i;
    }
    return -1;
}

struct Alias {
    uint32_t fourcc;
    int number;
};

constexpr Alias aliases[] = {
    {qvFourcc("YUNV"), numberOf("YUYV")}, {qvFourcc("YUY2"), numberOf("YUYV")},
    {qvFourcc("UYNV"), numberOf("UYVY")}, {qvFourcc("HDYC"), numberOf("UYVY")},
    {qvFourcc("b64a"), numberOf("B64A")}, {qvFourcc("Y16 "), numberOf("Y16")},
};

uint32_t codeOf(const char* name) {
    uint32_t code = 0;
    std::memcpy(&code, name, 4);
    return code;
}

// "W" and a digit for the chroma, then the bits in two digits.
int wideNumber(uint32_t fourcc) {
    const auto text = qvFourccText(fourcc);
    if (text[0] != 'W') return -1;
    const int bits = (text[2] - '0') * 10 + text[3] - '0';
    if (text[2] < '0' || text[2] > '1' || text[3] < '0' || text[3] > '9' || bits < 9 || bits > 16) return -1;
    const int family = text[1] == '0'   ? numberOf("W0XX")
                       : text[1] == '2' ? numberOf("W2XX")
                       : text[1] == '4' ? numberOf("W4XX")
                                        : -1;
    return family < 0 ? -1 : family | bits << 16;
}

// Pictures above this can't be walked with the offsets of one plane.
constexpr long long maxBytes = 1LL << 46;

bool strideServes(const Picture& picture, int plane, long long stride) {
    const long long least = lineBytes(*picture.format, picture.width, plane);
    return (stride < 0 ? -stride : stride) >= least || picture.planeHeight(plane) <= 1;
}

// U and V change places in formats that store V first.
void order(Picture& picture) {
    if (picture.format->planes() == 3 && !picture.format->has(uBeforeV))
        std::swap(picture.planes[1], picture.planes[2]);
}

}  // namespace

std::span<const Format, formatCount> formats() { return table; }

int formatNumber(uint32_t fourcc) {
    for (int i = 0; i < formatCount; ++i)
        if (codeOf(table[i].name) == fourcc) return i;
    for (const auto& alias : aliases)
        if (alias.fourcc == fourcc) return alias.number;
    return wideNumber(fourcc);
}

long long lineBytes(const Format& format, int width, int plane) {
    const long long w = width;
    switch (format.packing) {
        case planar8: return plane ? w / format.across() : w;
        case planar16: return 2 * (plane ? w / format.across() : w);
        case nv16: return plane ? w / 2 * 4 : 2 * w;
        case v210: return (w + 5) / 6 * 16;
        case uyvyWords:
        case yuyvWords: return 4 * w;
        default: return w * format.bits / 8;
    }
}

long long naturalStride(const Format& format, int width) {
    if (format.packing == v210) return qvDefaultStride(*qvPixelFormat(QvFourcc::v210), width);
    const long long bytes = lineBytes(format, width, 0);
    return format.packing == bytes3 || std::strcmp(format.name, "GRAY") == 0 ? (bytes + 3) & ~3LL : bytes;
}

bool layOut(Picture& picture, Byte* base, long long stride) {
    const Format& format = *picture.format;
    if (!base) return false;
    if (stride == 0) stride = naturalStride(format, picture.width);
    if (!strideServes(picture, 0, stride) || (stride < 0 && format.planes() > 1)) return false;
    if ((stride < 0 ? -stride : stride) * picture.height > maxBytes) return false;
    picture.planes[0] = {base, static_cast<std::ptrdiff_t>(stride)};
    const long long chroma = format.packing == nv16 ? stride : stride / format.across();
    for (int p = 1; p < format.planes(); ++p) {
        if (!strideServes(picture, p, chroma)) return false;
        const auto& before = picture.planes[p - 1];
        picture.planes[p] = {before.data + before.stride * picture.planeHeight(p - 1),
                             static_cast<std::ptrdiff_t>(chroma)};
    }
    order(picture);
    return true;
}

bool layOut(Picture& picture, Byte* const planes[3], const int strides[3]) {
    const Format& format = *picture.format;
    const long long luma = strides[0] ? strides[0] : naturalStride(format, picture.width);
    for (int p = 0; p < format.planes(); ++p) {
        long long stride = strides[p];
        if (stride == 0) stride = p == 0 || format.packing == nv16 ? luma : luma / format.across();
        const bool empty = picture.planeWidth(p) == 0 || picture.planeHeight(p) == 0;
        if ((!planes[p] && !empty) || !strideServes(picture, p, stride)) return false;
        picture.planes[p] = {planes[p], static_cast<std::ptrdiff_t>(stride)};
    }
    order(picture);
    return true;
}

}  // namespace srk
