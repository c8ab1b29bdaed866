#include "tarsel/words/rawnames.h"

#include <algorithm>

#include <qvplugcore/qvplugcore.h>

namespace {

namespace F = QvFourcc;

// The first row of a format has the extension that is recommended for it.
// clang-format off
constexpr RawName kNames[] = {
    {"raw",  0,       "any format: that of the frames, or --pixel"},
    {"i420", F::I420, "planes Y, U, V; chroma of half the width and height"},
    {"yuv",  F::I420, "as .i420; when it is read, pixel= may name another YUV format"},
    {"yv12", F::YV12, "planes Y, V, U; chroma of half the width and height"},
    {"i422", F::I422, "planes Y, U, V; chroma of half the width"},
    {"w016", F::W016, "planes Y, U, V of 16 bits; chroma of half the width and height"},
    {"yuyv", F::YUYV, "two pixels: Y U Y V"},
    {"yuy2", F::YUY2, "as .yuyv"},
    {"uyvy", F::UYVY, "two pixels: U Y V Y"},
    {"y216", F::Y216, "two pixels: Y U Y V of 16 bits"},
    {"v210", F::v210, "six pixels of 10 bits in four 32-bit words"},
    {"gray", F::GRAY, "one byte a pixel"},
    {"bgr3", F::BGR3, "B G R; rows padded to 4 bytes"},
    {"bgra", F::BGRA, "B G R A"},
    {"bgr4", F::BGR4, "as .bgra"},
    {"argb", F::ARGB, "A R G B"},
    {"b64a", F::b64a, "B G R A of 16 bits"},
};
constexpr OpenName kOpen[] = {
    {"rgb",  ".bgr3 or .bgra"},
    {"bgr",  ".bgr3"},
    {"rgb3", ".bgr3"},
    {"rgb4", ".bgra or .argb"},
    {"rgba", ".bgra or .argb"},
    {"abgr", ".bgra or .argb"},
    {"422",  ".i422, .yuyv or .uyvy"},
};
// clang-format on

template <class Row>
const Row* find(std::span<const Row> rows, std::string_view extension) {
    const auto found =
        std::find_if(rows.begin(), rows.end(), [&](const Row& row) { return row.extension == extension; });
    return found == rows.end() ? nullptr : &*found;
}

}  // namespace

std::span<const RawName> rawNames() { return kNames; }
std::span<const OpenName> openNames() { return kOpen; }

const RawName* rawName(std::string_view extension) { return find(rawNames(), extension); }
const OpenName* openName(std::string_view extension) { return find(openNames(), extension); }

std::string extensionOf(const std::string& file) {
    const Any extension = QvFile::getExt(Any(file.c_str()), true);
    return extension.asString("");
}

bool isYuv(unsigned fourcc) {
    const QvPixelFormat* format = qvPixelFormat(fourcc);
    return format && !format->rgb && fourcc != F::b64a && fourcc != F::R32C && fourcc != F::R555 &&
           fourcc != F::R565;
}

bool nameAllows(const RawName& name, unsigned fourcc, bool reading) {
    if (name.fourcc == 0 || qvEqualFourcc(name.fourcc, fourcc)) return true;
    return reading && name.extension == "yuv" && isYuv(fourcc);
}

std::string extensionFor(unsigned fourcc) {
    for (const RawName& row : kNames)
        if (row.fourcc == fourcc) return "." + std::string(row.extension);
    for (const RawName& row : kNames)
        if (row.fourcc != 0 && qvEqualFourcc(row.fourcc, fourcc)) return "." + std::string(row.extension);
    return ".raw";
}
