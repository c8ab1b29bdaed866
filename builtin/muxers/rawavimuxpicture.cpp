#include "builtin/muxers/rawavimuxpicture.h"

#include <algorithm>
#include <climits>
#include <cstring>

#include "core/media/qvbuffer.h"

namespace {

enum class Kind { rgb, packed, planar, asItIs };

struct Type {
    unsigned fourcc;
    unsigned compression;
    int bitsPerPixel;
    Kind kind;
};

constexpr Type types[] = {
    {QvFourcc::BGR3, 0, 24, Kind::rgb},
    {QvFourcc::BGR4, 0, 32, Kind::rgb},
    {QvFourcc::BGRA, 0, 32, Kind::rgb},
    {QvFourcc::I420, QvFourcc::I420, 12, Kind::planar},
    {QvFourcc::YV12, QvFourcc::YV12, 12, Kind::planar},
    {QvFourcc::YUYV, QvFourcc::YUY2, 16, Kind::packed},
    {QvFourcc::YUY2, QvFourcc::YUY2, 16, Kind::packed},
    {QvFourcc::UYVY, QvFourcc::UYVY, 16, Kind::packed},
    {QvFourcc::v210, QvFourcc::v210, 20, Kind::asItIs},
};

constexpr size_t bandBytes = 256 * 1024;  // stays in the cache

size_t positive(int value) { return static_cast<size_t>(value); }

size_t rowOfFile(Kind kind, size_t width, size_t stride) {
    switch (kind) {
        case Kind::rgb: return (stride + 3) & ~size_t{3};
        case Kind::packed: return (width + 1) / 2 * 4;
        default: return stride;
    }
}

}  // namespace

std::optional<AviPicture> AviPicture::of(unsigned fourcc, int width, int height) {
    const auto* type = std::find_if(std::begin(types), std::end(types),
                                    [fourcc](const Type& row) { return row.fourcc == fourcc; });
    constexpr int largest = 1 << 20;
    if (type == std::end(types) || width < 1 || height < 1 || width > largest || height > largest)
        return std::nullopt;
    unsigned char place = 0;  // for the shape alone: nothing is touched
    QvFrame shape;
    if (shape.init(fourcc, width, height, &place) != 0 || shape.total_bytes() > INT_MAX / 2)
        return std::nullopt;

    AviPicture picture;
    picture.compression_ = type->compression;
    picture.bitsPerPixel_ = type->bitsPerPixel;
    picture.width_ = width;
    picture.height_ = height;
    picture.frameBytes_ = positive(shape.total_bytes());

    const auto columns = positive(width);
    const auto stride = positive(shape.stride(0));
    const size_t rowBytes = type->kind == Kind::rgb ? columns * positive(shape.pixelBytes(0)) : stride;
    picture.planes_.push_back({0, stride, rowOfFile(type->kind, columns, rowBytes), rowBytes, height, height,
                               type->kind == Kind::packed ? 4 : 0, type->kind == Kind::rgb});
    const auto addChroma = [&](int plane, size_t from) {
        const auto chroma = positive(shape.stride(plane));
        picture.planes_.push_back(
            {from, chroma, (columns + 1) / 2, chroma, height / 2, (height + 1) / 2, 1, false});
    };
    const auto second = positive(shape.plane_bytes(0));
    const auto third = second + positive(shape.plane_bytes(1));
    if (type->kind == Kind::planar) {
        addChroma(1, second);
        addChroma(2, third);
    }
    for (const auto& plane : picture.planes_) picture.fileBytes_ += plane.toStride * positive(plane.toRows);
    return picture;
}

bool AviPicture::write(const unsigned char* frame, const Put& put) {
    for (size_t i = 0; i < planes_.size(); ++i) {
        const auto& plane = planes_[i];
        if (!plane.asItIs()) {
            if (!writeRows(plane, frame + plane.from, put)) return false;
            continue;
        }
        // Adjacent planes that need no change are written at once.
        size_t end = plane.from + plane.toStride * positive(plane.toRows);
        while (i + 1 < planes_.size() && planes_[i + 1].asItIs() && planes_[i + 1].from == end) {
            ++i;
            end += planes_[i].toStride * positive(planes_[i].toRows);
        }
        if (!put(frame + plane.from, end - plane.from)) return false;
    }
    return true;
}

bool AviPicture::writeRows(const Plane& plane, const unsigned char* from, const Put& put) {
    const size_t stride = plane.toStride;
    const int most = static_cast<int>(std::max<size_t>(bandBytes / stride, 1));
    band_.resize(positive(std::min(most, plane.toRows)) * stride);
    for (int row = 0; row < plane.toRows;) {
        const int rows = std::min(most, plane.toRows - row);
        unsigned char* to = band_.data();
        for (const int end = row + rows; row < end; ++row, to += stride) {
            const int source = std::min(plane.flip ? plane.fromRows - 1 - row : row, plane.fromRows - 1);
            const size_t taken = source < 0 ? 0 : plane.rowBytes;
            if (taken > 0) std::memcpy(to, from + positive(source) * plane.fromStride, taken);
            const auto before = positive(plane.repeat);
            for (size_t i = taken; i < stride; ++i)
                to[i] = before > 0 && i >= before ? to[i - before] : static_cast<unsigned char>(0);
        }
        if (!put(band_.data(), positive(rows) * stride)) return false;
    }
    return true;
}
