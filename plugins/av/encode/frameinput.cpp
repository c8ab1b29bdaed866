#include "plugins/av/encode/frameinput.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <utility>

#include "core/measure/fourcc.h"
#include "core/media/qvframe.h"

extern "C" {
#include <libswscale/swscale.h>
}

namespace av {

namespace {

using Word = std::uint16_t;
constexpr int alignment = 64;

struct Layouts {
    unsigned fourcc;
    AVPixelFormat eight, ten, twelve, sixteen;  // the first one is also that of a form with one depth
};

constexpr Layouts layoutsOf[] = {
    {QvFourcc::I420, AV_PIX_FMT_YUV420P, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE},
    {QvFourcc::W016, AV_PIX_FMT_NONE, AV_PIX_FMT_YUV420P10LE, AV_PIX_FMT_YUV420P12LE, AV_PIX_FMT_YUV420P16LE},
    {QvFourcc::YUYV, AV_PIX_FMT_YUV422P, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE},
    {QvFourcc::Y216, AV_PIX_FMT_NONE, AV_PIX_FMT_YUV422P10LE, AV_PIX_FMT_YUV422P12LE, AV_PIX_FMT_YUV422P16LE},
    {QvFourcc::BGR4, AV_PIX_FMT_BGR0, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE},
    {QvFourcc::BGRA, AV_PIX_FMT_BGRA, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE},
    {QvFourcc::b64a, AV_PIX_FMT_BGRA64LE, AV_PIX_FMT_NONE, AV_PIX_FMT_NONE, AV_PIX_FMT_RGBA64LE},
};

// What the pixels of a form are put into: the wanted layout where that needs no arithmetic on neighbours.
AVPixelFormat firstLayout(unsigned fourcc, AVPixelFormat wanted) {
    for (const Layouts& row : layoutsOf) {
        if (row.fourcc != fourcc) continue;
        for (const AVPixelFormat layout : {row.eight, row.ten, row.twelve, row.sixteen})
            if (layout == wanted && layout != AV_PIX_FMT_NONE) return wanted;
        return row.eight != AV_PIX_FMT_NONE ? row.eight : row.sixteen;
    }
    return AV_PIX_FMT_NONE;
}

// Samples of 16 bits to fewer: to the nearest, the half up, and the largest stays within the range.
class Narrow {
  public:
    explicit Narrow(int depth)
        : shift_(16 - depth), half_(shift_ > 0 ? 1u << (shift_ - 1) : 0), most_((1u << depth) - 1) {}
    Word operator()(Word value) const {
        return static_cast<Word>(std::min((unsigned{value} + half_) >> shift_, most_));
    }

  private:
    int shift_;
    unsigned half_, most_;
};

const unsigned char* rowOf(const QvFrame& frame, int plane, int y) {
    return frame.plane(plane) + std::ptrdiff_t{y} * frame.stride(plane);
}

template <class Sample>
Sample* rowOf(AVFrame& frame, int plane, int y) {
    return reinterpret_cast<Sample*>(frame.data[plane] + std::ptrdiff_t{y} * frame.linesize[plane]);
}

// Of an odd size the engine's planes of chroma lack the last column and row, which the library wants.
int chroma(int luma) { return (luma + 1) / 2; }

void copyBytes(const QvFrame& from, int plane, AVFrame& to, int bytes, int rows) {
    const int last = from.height(plane) - 1;
    const int there = std::min(bytes, plane == 0 ? bytes : from.width(plane));
    for (int y = 0; y < rows; ++y) {
        const unsigned char* const in = rowOf(from, plane, std::min(y, last));
        auto* const out = rowOf<std::uint8_t>(to, plane, y);
        std::memcpy(out, in, static_cast<std::size_t>(there));
        if (there > 0 && there < bytes) out[there] = out[there - 1];
    }
}

void copyWords(const QvFrame& from, int plane, AVFrame& to, int width, int rows, const Narrow& narrow) {
    const int last = from.height(plane) - 1;
    const int there = std::min(width, from.width(plane));
    for (int y = 0; y < rows; ++y) {
        const unsigned char* const in = rowOf(from, plane, std::min(y, last));
        auto* const out = rowOf<Word>(to, plane, y);
        for (int x = 0; x < there; ++x) {
            Word value;
            std::memcpy(&value, in + 2 * std::ptrdiff_t{x}, sizeof value);
            out[x] = narrow(value);
        }
        if (there > 0 && there < width) out[there] = out[there - 1];
    }
}

// Of pixels of four words; libswscale does not keep all bits of these.
void exchangeRedAndBlue(AVFrame& frame) {
    for (int y = 0; y < frame.height; ++y) {
        auto* const row = rowOf<Word>(frame, 0, y);
        for (int x = 0; x < frame.width; ++x) std::swap(row[4 * x], row[4 * x + 2]);
    }
}

// Y U Y V; an odd width ends with Y U, and has its last V from the pair before.
template <class Sample, class Change>
void separate(const QvFrame& from, AVFrame& to, int width, int height, const Change& change) {
    const int pairs = width / 2;
    for (int y = 0; y < height; ++y) {
        const auto* const in = reinterpret_cast<const Sample*>(rowOf(from, 0, y));
        auto *const luma = rowOf<Sample>(to, 0, y), *const u = rowOf<Sample>(to, 1, y),
                    *const v = rowOf<Sample>(to, 2, y);
        for (int x = 0; x < pairs; ++x) {
            luma[2 * x] = change(in[4 * x]);
            u[x] = change(in[4 * x + 1]);
            luma[2 * x + 1] = change(in[4 * x + 2]);
            v[x] = change(in[4 * x + 3]);
        }
        if (width & 1) {
            luma[2 * pairs] = change(in[4 * pairs]);
            u[pairs] = change(in[4 * pairs + 1]);
            v[pairs] = pairs > 0 ? v[pairs - 1] : static_cast<Sample>(1u << (8 * sizeof(Sample) - 1));
        }
    }
}

}  // namespace

FrameInput::~FrameInput() { close(); }

void FrameInput::close() {
    sws_freeContext(scaler_);
    scaler_ = nullptr;
    frame_.reset();
    unpacked_.reset();
    pool_.reset();
}

bool FrameInput::open(unsigned fourcc, AVPixelFormat layout, int width, int height, AVColorSpace colour,
                      bool borrows) {
    close();
    fourcc_ = fourcc;
    layout_ = layout;
    first_ = firstLayout(fourcc, layout);
    width_ = width;
    height_ = height;
    const bool even = width % 2 == 0 && height % 2 == 0;
    borrows_ = borrows && first_ == layout && fourcc == QvFourcc::I420 && even;
    const int bytes = av_image_get_buffer_size(layout, width, height, alignment);
    if (first_ == AV_PIX_FMT_NONE || bytes <= 0) return false;
    pool_.reset(av_buffer_pool_init(static_cast<std::size_t>(bytes) + alignment, nullptr));
    frame_.reset(av_frame_alloc());
    if (!pool_ || !frame_) return false;
    if (first_ == layout) return true;
    unpacked_.reset(av_frame_alloc());
    if (!unpacked_) return false;
    unpacked_->format = first_;
    unpacked_->width = width;
    unpacked_->height = height;
    if (av_frame_get_buffer(unpacked_.get(), 0) < 0) return false;
    scaler_ = sws_getContext(width, height, first_, width, height, layout, SWS_BICUBIC | SWS_ACCURATE_RND,
                             nullptr, nullptr, nullptr);
    if (!scaler_) return false;
    const int* const matrix = sws_getCoefficients(colour);
    const auto isRgb = [](AVPixelFormat format) {
        return (av_pix_fmt_desc_get(format)->flags & AV_PIX_FMT_FLAG_RGB) != 0;
    };
    sws_setColorspaceDetails(scaler_, matrix, isRgb(first_), matrix, isRgb(layout), 0, 1 << 16, 1 << 16);
    return true;
}

bool FrameInput::blank(AVFrame& frame, AVPixelFormat layout) const {
    av_frame_unref(&frame);
    frame.buf[0] = av_buffer_pool_get(pool_.get());
    if (!frame.buf[0]) return false;
    frame.format = layout;
    frame.width = width_;
    frame.height = height_;
    return av_image_fill_arrays(frame.data, frame.linesize, frame.buf[0]->data, layout, width_, height_,
                                alignment) >= 0;
}

bool FrameInput::lend(const QvFrame& from) {
    av_frame_unref(frame_.get());
    AVFrame& frame = *frame_;
    for (int plane = 0; plane < 3; ++plane) {
        frame.data[plane] = const_cast<unsigned char*>(from.plane(plane));
        frame.linesize[plane] = from.stride(plane);
    }
    frame.format = layout_;
    frame.width = width_;
    frame.height = height_;
    const auto keep = [](void*, std::uint8_t*) {};
    frame.buf[0] = av_buffer_create(frame.data[0], static_cast<std::size_t>(from.total_bytes()), keep,
                                    nullptr, AV_BUFFER_FLAG_READONLY);
    return frame.buf[0] != nullptr;
}

void FrameInput::unpack(const QvFrame& from, AVFrame& to) const {
    const auto* const layout = av_pix_fmt_desc_get(static_cast<AVPixelFormat>(to.format));
    const Narrow narrow(layout->comp[0].depth > 8 ? layout->comp[0].depth : 16);
    switch (fourcc_) {
        case QvFourcc::I420:
            copyBytes(from, 0, to, width_, height_);
            for (const int plane : {1, 2}) copyBytes(from, plane, to, chroma(width_), chroma(height_));
            break;
        case QvFourcc::W016:
            copyWords(from, 0, to, width_, height_, narrow);
            for (const int plane : {1, 2})
                copyWords(from, plane, to, chroma(width_), chroma(height_), narrow);
            break;
        case QvFourcc::YUYV:
            separate<std::uint8_t>(from, to, width_, height_, [](std::uint8_t value) { return value; });
            break;
        case QvFourcc::Y216: separate<Word>(from, to, width_, height_, narrow); break;
        case QvFourcc::b64a:
            copyBytes(from, 0, to, 8 * width_, height_);
            if (to.format == AV_PIX_FMT_RGBA64LE) exchangeRedAndBlue(to);
            break;
        default: copyBytes(from, 0, to, 4 * width_, height_); break;
    }
}

AVFrame* FrameInput::take(const QvFrame& from) {
    if (borrows_) return lend(from) ? frame_.get() : nullptr;
    if (!blank(*frame_, layout_)) return nullptr;
    AVFrame& to = *frame_;
    if (!scaler_) {
        unpack(from, to);
        return &to;
    }
    unpack(from, *unpacked_);
    const int rows =
        sws_scale(scaler_, unpacked_->data, unpacked_->linesize, 0, height_, to.data, to.linesize);
    return rows > 0 ? &to : nullptr;
}

}  // namespace av
