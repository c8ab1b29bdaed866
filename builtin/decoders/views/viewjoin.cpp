#include "builtin/decoders/views/viewjoin.h"

#include <cstddef>
#include <cstring>

namespace {

// What a plane of a view takes of a plane of the join.
struct PlaneShape {
    int rows;
    std::size_t rowBytes;
};

PlaneShape shapeOf(const QvFrame& view, const QvPixelFormat& format, int plane) {
    const bool chroma = plane > 0 && format.chroma != QvChroma::none;
    const int columns = chroma ? view.width() / 2 : view.width();
    const int rows = chroma && format.chroma == QvChroma::quarter ? view.height() / 2 : view.height();
    // v210: groups of 6 pixels in 16 bytes.
    const int bytes = format.pixelBytes > 0 ? columns * format.pixelBytes : columns / 6 * 16;
    return {rows, static_cast<std::size_t>(bytes)};
}

}  // namespace

std::string qvViewJoinFault(QvViewLayout layout, unsigned fourcc, int width, int height) {
    const QvPixelFormat* format = qvPixelFormat(fourcc);
    if (!format) return "its pixel format is not known";
    const bool across = layout == QvViewLayout::sideBySide;
    if (across) {
        const bool pairs = format->chroma != QvChroma::none || fourcc == QvFourcc::YUY2 ||
                           fourcc == QvFourcc::YUYV || fourcc == QvFourcc::UYVY || fourcc == QvFourcc::Y216;
        const int unit = format->pixelBytes < 0 ? 48 : pairs ? 2 : 1;
        if (width % unit != 0)
            return "a width of " + std::to_string(width) + " is no multiple of " + std::to_string(unit) +
                   ", as pictures in " + qvFourccText(fourcc).data() + " side by side need";
    } else if (format->chroma == QvChroma::quarter && height % 2 != 0) {
        return "a height of " + std::to_string(height) + " is odd, which pictures in " +
               qvFourccText(fourcc).data() + " can't be to be joined";
    }
    return "";
}

void qvJoinViews(QvViewLayout layout, std::span<QvFrame* const> views, QvFrame& to) {
    const QvPixelFormat& format = *qvPixelFormat(to.four_cc());
    const auto count = static_cast<std::ptrdiff_t>(views.size());
    for (int plane = 0; plane < to.planes(); ++plane) {
        const PlaneShape shape = shapeOf(*views.front(), format, plane);
        const std::ptrdiff_t stride = to.stride(plane);
        for (std::ptrdiff_t i = 0; i < count; ++i) {
            const QvFrame& view = *views[static_cast<std::size_t>(i)];
            unsigned char* out = to.plane(plane);
            std::ptrdiff_t step = stride;
            if (layout == QvViewLayout::sideBySide) {
                out += i * static_cast<std::ptrdiff_t>(shape.rowBytes);
            } else if (layout == QvViewLayout::topBottom) {
                out += i * shape.rows * stride;
            } else {
                out += i * stride;
                step *= count;
            }
            const unsigned char* in = view.plane(plane);
            for (int row = 0; row < shape.rows; ++row, out += step, in += view.stride(plane))
                std::memcpy(out, in, shape.rowBytes);
        }
    }
}
