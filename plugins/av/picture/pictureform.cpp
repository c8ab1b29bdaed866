#include "plugins/av/picture/pictureform.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "core/measure/fourcc.h"
#include "core/media/qvframe.h"

extern "C" {
#include <libswscale/swscale.h>
}

namespace av {

namespace {

using Word = std::uint16_t;

bool isRgb(const AVPixFmtDescriptor& layout) {
    return (layout.flags & (AV_PIX_FMT_FLAG_RGB | AV_PIX_FMT_FLAG_PAL)) != 0;
}

// Planar YUV whose samples are 8 bits or words of this machine, chroma halved across.
bool isPlain(const AVPixFmtDescriptor& layout, AVPixelFormat format) {
    const bool words = layout.comp[0].depth > 8;
    return (layout.flags & AV_PIX_FMT_FLAG_PLANAR) && !(layout.flags & AV_PIX_FMT_FLAG_BE) &&
           !(layout.flags & AV_PIX_FMT_FLAG_ALPHA) && layout.nb_components == 3 &&
           layout.comp[1].plane == 1 && layout.comp[2].plane == 2 && layout.comp[0].step == (words ? 2 : 1) &&
           layout.comp[0].shift == 0 && layout.log2_chroma_w == 1 && format != AV_PIX_FMT_NONE;
}

AVPixelFormat wordsOf(int depth, bool half) {
    if (depth <= 10) return half ? AV_PIX_FMT_YUV422P10LE : AV_PIX_FMT_YUV420P10LE;
    if (depth <= 12) return half ? AV_PIX_FMT_YUV422P12LE : AV_PIX_FMT_YUV420P12LE;
    return half ? AV_PIX_FMT_YUV422P16LE : AV_PIX_FMT_YUV420P16LE;
}

int depthOf(AVPixelFormat format) { return av_pix_fmt_desc_get(format)->comp[0].depth; }

void copyRows(const AVFrame& from, int plane, QvFrame& to, std::size_t bytes, int rows) {
    for (int y = 0; y < rows; ++y)
        std::memcpy(to.plane(plane) + std::ptrdiff_t{y} * to.stride(plane),
                    from.data[plane] + std::ptrdiff_t{y} * from.linesize[plane], bytes);
}

template <class Sample>
const Sample* row(const AVFrame& from, int plane, int y) {
    return reinterpret_cast<const Sample*>(from.data[plane] + std::ptrdiff_t{y} * from.linesize[plane]);
}

// Rows of a frame of odd width begin at any byte.
void shiftRows(const AVFrame& from, int plane, QvFrame& to, int width, int rows, int shift) {
    for (int y = 0; y < rows; ++y) {
        const Word* const in = row<Word>(from, plane, y);
        unsigned char* const out = to.plane(plane) + std::ptrdiff_t{y} * to.stride(plane);
        for (int x = 0; x < width; ++x) {
            const auto value = static_cast<Word>(in[x] << shift);
            std::memcpy(out + 2 * std::ptrdiff_t{x}, &value, sizeof value);
        }
    }
}

// Y U Y V. An odd width ends with Y U.
template <class Sample>
void interleave(const AVFrame& from, QvFrame& to, int shift) {
    const int width = to.width(), pairs = width / 2;
    for (int y = 0; y < to.height(); ++y) {
        const Sample *luma = row<Sample>(from, 0, y), *u = row<Sample>(from, 1, y),
                     *v = row<Sample>(from, 2, y);
        auto* const out = reinterpret_cast<Sample*>(to.plane(0) + std::ptrdiff_t{y} * to.stride(0));
        for (int x = 0; x < pairs; ++x) {
            out[4 * x] = static_cast<Sample>(luma[2 * x] << shift);
            out[4 * x + 1] = static_cast<Sample>(u[x] << shift);
            out[4 * x + 2] = static_cast<Sample>(luma[2 * x + 1] << shift);
            out[4 * x + 3] = static_cast<Sample>(v[x] << shift);
        }
        if (width & 1) {
            out[4 * pairs] = static_cast<Sample>(luma[2 * pairs] << shift);
            out[4 * pairs + 1] = static_cast<Sample>(u[pairs] << shift);
        }
    }
}

std::string nameOf(AVPixelFormat layout) {
    const char* const name = av_get_pix_fmt_name(layout);
    return name ? name : "unknown";
}

// The form by what the layout has, before how it is made.
PictureForm nearest(const AVPixFmtDescriptor& layout, AVPixelFormat format) {
    const int depth = layout.comp[0].depth;
    const bool deep = depth > 8;
    const bool alpha = (layout.flags & AV_PIX_FMT_FLAG_ALPHA) != 0;
    const bool grey = layout.nb_components < 3 && !isRgb(layout);
    const bool xyz = format == AV_PIX_FMT_XYZ12LE || format == AV_PIX_FMT_XYZ12BE;
    const int wide = layout.log2_chroma_w, high = layout.log2_chroma_h;
    if (isRgb(layout) || xyz || (!grey && wide == 0 && high == 0)) {
        if (deep) return {QvFourcc::b64a, AV_PIX_FMT_BGRA64LE, 0, ""};
        return {alpha ? QvFourcc::BGRA : QvFourcc::BGR4, AV_PIX_FMT_BGRA, 0, ""};
    }
    const bool half = !grey && high == 0;
    if (half || (wide == 0 && !grey)) {
        if (!deep) return {QvFourcc::YUYV, AV_PIX_FMT_YUV422P, 0, ""};
        return {QvFourcc::Y216, wordsOf(depth, true), 0, ""};
    }
    if (!deep) return {QvFourcc::I420, AV_PIX_FMT_YUV420P, 0, ""};
    return {QvFourcc::W016, wordsOf(depth, false), 0, ""};
}

}  // namespace

bool isFullRange(const AVFrame& frame) {
    switch (frame.format) {
        case AV_PIX_FMT_YUVJ420P:
        case AV_PIX_FMT_YUVJ422P:
        case AV_PIX_FMT_YUVJ444P:
        case AV_PIX_FMT_YUVJ440P:
        case AV_PIX_FMT_YUVJ411P: return true;
        default: return frame.color_range == AVCOL_RANGE_JPEG;
    }
}

PictureForm formOf(AVPixelFormat format, bool fullRange) {
    const AVPixFmtDescriptor* const layout = av_pix_fmt_desc_get(format);
    if (!layout || (layout->flags & (AV_PIX_FMT_FLAG_HWACCEL | AV_PIX_FMT_FLAG_BITSTREAM)) ||
        layout->nb_components == 0)
        return {};
    PictureForm form = nearest(*layout, format);
    const bool planes = form.fourcc == QvFourcc::I420 || form.fourcc == QvFourcc::W016;
    const bool pairs = form.fourcc == QvFourcc::YUYV || form.fourcc == QvFourcc::Y216;
    if (!fullRange && (planes || pairs) && isPlain(*layout, format) &&
        layout->log2_chroma_h == (planes ? 1 : 0))
        form.from = format;
    else if (form.fourcc == QvFourcc::YUYV)
        form.from = AV_PIX_FMT_YUYV422;
    if (form.fourcc == QvFourcc::W016 || form.fourcc == QvFourcc::Y216) form.shift = 16 - depthOf(form.from);
    const bool yuv = planes || pairs;
    if (format == form.from && !(fullRange && yuv)) return form;
    form.lost = nameOf(format) + (fullRange && yuv ? " of full range" : "") + " is converted to " +
                qvFourccText(form.fourcc).data() + (fullRange && yuv ? " at video levels" : "");
    if ((layout->flags & AV_PIX_FMT_FLAG_ALPHA) && yuv) form.lost += ", without its alpha";
    return form;
}

FormWriter::FormWriter(const PictureForm& form, int width, int height)
    : form_(form), width_(width), height_(height) {}

FormWriter::~FormWriter() { sws_freeContext(scaler_); }

// The range is given before the scaler is set up: afterwards it may have chosen a plain copy.
bool FormWriter::prepare(const AVFrame& from) {
    const Source source{from.width, from.height, from.format, isFullRange(from), from.colorspace};
    if (scaler_ && source == source_) return true;
    sws_freeContext(scaler_);
    scaler_ = sws_alloc_context();
    if (!scaler_) return false;
    const auto set = [&](const char* name, int value) { av_opt_set_int(scaler_, name, value, 0); };
    set("srcw", source.width);
    set("srch", source.height);
    set("src_format", source.layout);
    set("src_range", source.full);
    set("dstw", width_);
    set("dsth", height_);
    set("dst_format", form_.from);
    set("sws_flags", SWS_BICUBIC);
    if (sws_init_context(scaler_, nullptr, nullptr) < 0) {
        sws_freeContext(scaler_);
        scaler_ = nullptr;
        return false;
    }
    const int* const matrix = sws_getCoefficients(source.matrix);
    sws_setColorspaceDetails(scaler_, matrix, source.full, matrix, 0, 0, 1 << 16, 1 << 16);
    source_ = source;
    return true;
}

const AVFrame* FormWriter::convert(const AVFrame& from) {
    if (!prepare(from)) return nullptr;
    if (!scaled_) {
        scaled_.reset(av_frame_alloc());
        if (!scaled_) return nullptr;
        scaled_->format = form_.from;
        scaled_->width = width_;
        scaled_->height = height_;
        if (av_frame_get_buffer(scaled_.get(), 0) < 0) {
            scaled_.reset();
            return nullptr;
        }
    }
    return sws_scale(scaler_, from.data, from.linesize, 0, from.height, scaled_->data, scaled_->linesize) > 0
               ? scaled_.get()
               : nullptr;
}

bool FormWriter::write(const AVFrame& decoded, QvFrame& to) {
    const bool yuv = form_.from != AV_PIX_FMT_BGRA && form_.from != AV_PIX_FMT_BGRA64LE;
    const bool direct = decoded.format == form_.from && decoded.width == width_ &&
                        decoded.height == height_ && !(yuv && isFullRange(decoded));
    const AVFrame* const from = direct ? &decoded : convert(decoded);
    if (!from) return false;
    const auto pixels = static_cast<std::size_t>(width_);
    switch (to.four_cc()) {
        case QvFourcc::I420:
            for (int plane = 0; plane < 3; ++plane)
                copyRows(*from, plane, to, static_cast<std::size_t>(to.width(plane)), to.height(plane));
            return true;
        case QvFourcc::W016:
            for (int plane = 0; plane < 3; ++plane)
                shiftRows(*from, plane, to, to.width(plane), to.height(plane), form_.shift);
            return true;
        case QvFourcc::YUYV:
            if (form_.from == AV_PIX_FMT_YUYV422)
                copyRows(*from, 0, to, 2 * pixels, height_);
            else
                interleave<std::uint8_t>(*from, to, 0);
            return true;
        case QvFourcc::Y216: interleave<Word>(*from, to, form_.shift); return true;
        case QvFourcc::b64a: copyRows(*from, 0, to, 8 * pixels, height_); return true;
        default: copyRows(*from, 0, to, 4 * pixels, height_); return true;
    }
}

}  // namespace av
