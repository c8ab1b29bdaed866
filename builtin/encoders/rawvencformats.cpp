#include "builtin/encoders/rawvencformats.h"

#include <algorithm>
#include <cstring>

#include "core/engine/status.h"
#include "core/measure/fourcc.h"
#include "core/measure/qvgeometry.h"

namespace rawvenc {

namespace {

struct OutputType {
    unsigned type;
    const char* name;
    bool restricted;  // also offered by the profile of uncompressed AVI
};

constexpr OutputType outputTypes[] = {
    {QvFourcc::BGR3, "BGR3 24-bit RGB", true},
    {QvFourcc::BGR4, "BGR4 32-bit RGB", false},
    {QvFourcc::I420, "I420 YUV planar", true},
    {QvFourcc::YV12, "YV12 YUV planar", true},
    {QvFourcc::YUYV, "YUYV/YUY2 YUV 4:2:2", true},
    {QvFourcc::UYVY, "UYVY YUV 4:2:2", true},
    {QvFourcc::v210, "V210", true},
    {QvFourcc::Y216, "Y216", true},
    {QvFourcc::W016, "W016", false},
    {QvFourcc::b64a, "b64a", false},
};

constexpr int uncompressedAvi = 0x2160010;

struct Rate {
    double rate;
    int interlaced;
};

constexpr Rate rates[] = {
    {7.6, 0},    {9.1, 0},   {10.0, 0}, {12.5, 0},  {12.8, 0},   {16.0, 0},  {18.0, 0}, {15.0, 0},
    {23.976, 0}, {24.0, 0},  {25.0, 0}, {25.0, 1},  {29.97, 0},  {29.97, 1}, {30.0, 0}, {48.0, 0},
    {50.0, 0},   {59.94, 0}, {60.0, 0}, {100.0, 0}, {119.88, 0}, {120.0, 0},
};

// All rows of a plane, the part of one included that an odd height leaves at the end of the chroma.
void copyPlane(QvFrame& to, const QvFrame& from, int plane) {
    const int toStride = to.stride(plane);
    const int fromStride = from.stride(plane);
    const auto row = static_cast<size_t>(std::min(toStride, fromStride));
    int rows = to.plane_bytes(plane) / toStride;
    unsigned char* target = to.plane(plane);
    const unsigned char* source = from.plane(plane);
    for (; rows > 0; --rows, target += toStride, source += fromStride) std::memcpy(target, source, row);
    std::memcpy(target, source, static_cast<size_t>(to.plane_bytes(plane) % toStride));
}

}  // namespace

// Unlike a frame's own assignment this takes every row of I422.
int copyPacked(QvFrame& to, const QvFrame& from) {
    if (to.four_cc() != from.four_cc() || to.width() != from.width() || to.height() != from.height() ||
        !to.inited())
        if (const int result = to.init(from.four_cc(), from.width(), from.height())) return result;
    if (to.total_bytes() == from.total_bytes())
        std::memcpy(to.plane(), from.plane(), static_cast<size_t>(to.total_bytes()));
    else
        for (int plane = 0; plane < to.planes(); ++plane) copyPlane(to, from, plane);
    to.copyMeta(from);
    return QvStatus::ok;
}

int v210Bytes(int width, int height) {
    return static_cast<int>(qvDefaultStride(*qvPixelFormat(QvFourcc::v210), width)) * height;
}

long long frameBytesBound(int width, int height) { return 8LL * width * height + 128LL * height; }

AnyVector inputTypes() {
    AnyVector types;
    for (const auto code :
         {QvFourcc::BGR4, QvFourcc::BGR3, QvFourcc::I420, QvFourcc::YUY2, QvFourcc::YV12, QvFourcc::Y216})
        types.append(static_cast<int>(code));
    return types;
}

AnyVector allowedTypes(int profile) {
    AnyVector allowed;
    for (const auto& row : outputTypes)
        if (row.restricted || profile != uncompressedAvi)
            allowed.append(AnyDict("type", static_cast<int>(row.type), "name", row.name));
    return allowed;
}

AnyVector framerates() {
    AnyVector all;
    for (const auto& row : rates) all.append(QvFramerate(row.rate, row.interlaced));
    return all;
}

}  // namespace rawvenc
