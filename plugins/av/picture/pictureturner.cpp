#include "plugins/av/picture/pictureturner.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <cstdint>
#include <cstring>

namespace av {

namespace {

constexpr int planes = 4;
constexpr int tile = 32;  // samples; both sides of a tile stay in the first cache

constexpr std::array<AVPixelFormat, 2> quarterTurns[] = {
    {AV_PIX_FMT_YUV422P, AV_PIX_FMT_YUV440P},
    {AV_PIX_FMT_YUVJ422P, AV_PIX_FMT_YUVJ440P},
    {AV_PIX_FMT_YUV422P10LE, AV_PIX_FMT_YUV440P10LE},
    {AV_PIX_FMT_YUV422P12LE, AV_PIX_FMT_YUV440P12LE},
};

// Bytes from a sample of the plane to the next; 0 for a plane that is not there, -1 where its components
// differ.
int stepOf(const AVPixFmtDescriptor& layout, int plane) {
    int step = 0;
    for (int i = 0; i < layout.nb_components; ++i) {
        const AVComponentDescriptor& component = layout.comp[i];
        if (component.plane != plane) continue;
        if (step != 0 && step != component.step) return -1;
        step = component.step;
    }
    return step;
}

struct Plane {
    const std::uint8_t* from;
    std::uint8_t* to;
    std::ptrdiff_t fromRow, toRow;  // bytes from a row to the next
    int width, height;              // of the result
    int step;
};

struct Sides {
    bool swap, flipX, flipY;
};

template <std::size_t bytes>
void turnPlane(const Plane& plane, const Sides& sides) {
    const std::ptrdiff_t across = sides.swap ? plane.fromRow : plane.step;
    const std::ptrdiff_t down = sides.swap ? plane.step : plane.fromRow;
    const std::uint8_t* const corner = plane.from + (sides.flipX ? across * (plane.width - 1) : 0) +
                                       (sides.flipY ? down * (plane.height - 1) : 0);
    const std::ptrdiff_t nextX = sides.flipX ? -across : across, nextY = sides.flipY ? -down : down;
    for (int top = 0; top < plane.height; top += tile)
        for (int left = 0; left < plane.width; left += tile) {
            const int bottom = std::min(top + tile, plane.height), right = std::min(left + tile, plane.width);
            for (int y = top; y < bottom; ++y) {
                const std::uint8_t* from = corner + nextX * left + nextY * y;
                std::uint8_t* to = plane.to + plane.toRow * y + static_cast<std::ptrdiff_t>(bytes) * left;
                for (int x = left; x < right; ++x, from += nextX, to += bytes) std::memcpy(to, from, bytes);
            }
        }
}

bool turnAny(const Plane& plane, const Sides& sides) {
    switch (plane.step) {
        case 1: turnPlane<1>(plane, sides); return true;
        case 2: turnPlane<2>(plane, sides); return true;
        case 3: turnPlane<3>(plane, sides); return true;
        case 4: turnPlane<4>(plane, sides); return true;
        case 6: turnPlane<6>(plane, sides); return true;
        case 8: turnPlane<8>(plane, sides); return true;
        default: return false;
    }
}

}  // namespace

// A film's mirroring is top to bottom and comes before its turn.
PictureTurner::PictureTurner(const Turn& turn)
    : swap_(turn.clockwise == 90 || turn.clockwise == 270),
      flipX_(turn.clockwise == 180 || (swap_ && (turn.clockwise == 90) != turn.mirrored)),
      flipY_(turn.clockwise == 270 || (!swap_ && (turn.clockwise == 180) != turn.mirrored)) {}

AVPixelFormat PictureTurner::layoutFor(AVPixelFormat layout) const {
    const AVPixFmtDescriptor* const row = av_pix_fmt_desc_get(layout);
    constexpr std::uint64_t none =
        AV_PIX_FMT_FLAG_HWACCEL | AV_PIX_FMT_FLAG_BITSTREAM | AV_PIX_FMT_FLAG_BAYER;
    if (!row || (row->flags & none)) return AV_PIX_FMT_NONE;
    constexpr int widest = 8;
    for (int plane = 0; plane < planes; ++plane)
        if (const int step = stepOf(*row, plane); step < 0 || step == 5 || step == 7 || step > widest)
            return AV_PIX_FMT_NONE;
    if (!swap_ || row->log2_chroma_w == row->log2_chroma_h) return layout;
    for (const auto& [wide, high] : quarterTurns) {
        if (layout == wide) return high;
        if (layout == high) return wide;
    }
    return AV_PIX_FMT_NONE;
}

bool PictureTurner::prepare(const AVFrame& picture, AVPixelFormat layout) {
    const int width = swap_ ? picture.height : picture.width, height = swap_ ? picture.width : picture.height;
    if (turned_ && turned_->format == layout && turned_->width == width && turned_->height == height)
        return true;
    turned_.reset(av_frame_alloc());
    if (!turned_) return false;
    turned_->format = layout;
    turned_->width = width;
    turned_->height = height;
    if (av_frame_get_buffer(turned_.get(), 0) >= 0) return true;
    turned_.reset();
    return false;
}

// Rows that became columns have no fields any more.
void PictureTurner::turnFields(const AVFrame& picture) {
    turned_->interlaced_frame = swap_ ? 0 : picture.interlaced_frame;
    const bool other = flipY_ && picture.height % 2 == 0;
    turned_->top_field_first = other ? !picture.top_field_first : picture.top_field_first;
}

const AVFrame* PictureTurner::turn(const AVFrame& picture) {
    const AVPixelFormat layout = layoutFor(static_cast<AVPixelFormat>(picture.format));
    if (layout == AV_PIX_FMT_NONE || !prepare(picture, layout)) return nullptr;
    const AVPixFmtDescriptor& row = *av_pix_fmt_desc_get(layout);
    const bool palette = (row.flags & AV_PIX_FMT_FLAG_PAL) != 0;
    for (int i = 0; i < planes; ++i) {
        const int step = stepOf(row, i);
        if (step == 0) continue;
        const bool chroma = (i == 1 || i == 2) && !(row.flags & AV_PIX_FMT_FLAG_RGB);
        const Plane plane{picture.data[i],
                          turned_->data[i],
                          picture.linesize[i],
                          turned_->linesize[i],
                          chroma ? AV_CEIL_RSHIFT(turned_->width, row.log2_chroma_w) : turned_->width,
                          chroma ? AV_CEIL_RSHIFT(turned_->height, row.log2_chroma_h) : turned_->height,
                          step};
        if (!turnAny(plane, {swap_, flipX_, flipY_})) return nullptr;
    }
    if (palette) std::memcpy(turned_->data[1], picture.data[1], AVPALETTE_SIZE);
    turned_->color_range = picture.color_range;
    turned_->colorspace = picture.colorspace;
    turnFields(picture);
    return turned_.get();
}

}  // namespace av
