#include "core/filter/qvcolorconvert.h"

#include <algorithm>
#include <cstdint>
#include <cstring>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/engine/modules/qvregistry.h"
#include "core/engine/status.h"
#include "core/filter/qvfilter.h"
#include "core/filter/srscaler.h"
#include "core/measure/fourcc.h"
#include "core/media/qvframe.h"
#include "core/media/rows_p.h"

namespace {

constexpr int videoFilterInterface = 12;

QvVideoFilter* filterOf(QvCodec* codec) {
    return codec ? static_cast<QvVideoFilter*>(codec->getInterface(videoFilterInterface)) : nullptr;
}

void takeShape(QvFrame& frame, unsigned fourcc, const QvFrame& like) {
    if (frame.inited() && frame.four_cc() == fourcc && frame.width() == like.width() &&
        frame.height() == like.height())
        return;
    QV_ASSERT_MSG(frame.init(fourcc, like.width(), like.height()) == QvStatus::ok, "out of memory");
}

void reversePixels(const QvFrame& in, QvFrame& out) {
    for (int y = 0; y < in.height(); ++y) {
        const unsigned char* from = in.plane() + static_cast<std::ptrdiff_t>(in.stride()) * y;
        unsigned char* to = out.plane() + static_cast<std::ptrdiff_t>(out.stride()) * y;
        for (int x = 0; x < in.width(); ++x) {
            uint32_t pixel;
            std::memcpy(&pixel, from + 4 * x, 4);
            pixel = __builtin_bswap32(pixel);
            std::memcpy(to + 4 * x, &pixel, 4);
        }
    }
}

// Assigning a frame leaves the lower half of the chroma of I422 as it was.
void assign(QvFrame& to, const QvFrame& from) {
    to = from;
    if (!to.inited() || to.four_cc() != QvFourcc::I422) return;
    for (int p = 1; p < 3; ++p)
        qvrows::copy(to.plane(p), to.stride(p), from.plane(p), from.stride(p),
                     std::min(to.stride(p), from.stride(p)), to.height());
}

QvScalePicture pictureOf(const QvFrame& frame) {
    const frame_tt& tt = *frame.getFrame_tt();
    return {qvFourcc("EXT1"), tt.four_cc,    tt.width,      tt.height,
            tt.strides[0],    tt.strides[1], tt.strides[2], {tt.planes[0], tt.planes[1], tt.planes[2]}};
}

constexpr int groupPixels = 6, groupBytes = 16;

}  // namespace

QvColorConverter::QvColorConverter(unsigned int fourcc, bool itu709To601, bool itu601To709)
    : codec_(qv_registry()->newCodec("scaler")), width_(320), height_(240) {
    QV_ASSERT_MSG(filterOf(codec_.get()),
                  "Tarsel library not initialized, can not create colorconverter module");
    if (itu709To601 || itu601To709) {
        codec_->setParam("inITU", itu709To601 ? 2 : 1);
        codec_->setParam("outITU", itu709To601 ? 1 : 2);
    }
    codec_->setParam("outWidth", width_);
    codec_->setParam("outHeight", height_);
    codec_->setParam("FOURCC", static_cast<int>(fourcc));
    open_ = codec_->open() == QvStatus::ok;
    QV_ASSERT_MEMORY(open_ || codec_->errorCode() != QvStatus::outOfMemory,
                     "no memory for a colour converter");
    QV_ASSERT_MSG(open_, "Invalid input four cc given");
}

QvColorConverter::~QvColorConverter() = default;

bool QvColorConverter::_inputFormatChanged(const QvFrame& in) const {
    return in.width() != width_ || in.height() != height_;
}

int QvColorConverter::_reopenConverter(const QvFrame& in) {
    codec_->close();
    width_ = in.width();
    height_ = in.height();
    codec_->setParam("outWidth", width_);
    codec_->setParam("outHeight", height_);
    const int result = codec_->open();
    open_ = result == QvStatus::ok;
    return result;
}

int QvColorConverter::convert(const QvFrame& in, QvFrame& out) {
    QV_ASSERT_MSG(codec_ && open_ && in.inited(), "converter in invalid state");
    QvVideoFilter* filter = filterOf(codec_.get());
    if (_inputFormatChanged(in))
        if (const int result = _reopenConverter(in)) {
            qv_dbg()->error("Failed to reopen color converter, input FCC=%s, w=%d, h=%d", in.str_four_cc(),
                            in.width(), in.height());
            return result;
        }
    if (const int result = filter->write(const_cast<QvFrame&>(in))) {
        qv_dbg()->error("Failed to color convert, input FCC=%s, w=%d, h=%d", in.str_four_cc(), in.width(),
                        in.height());
        return result;
    }
    QV_ASSERT(filter->ready() > 0);
    assign(out, *filter->frame());
    filter->next();
    return QvStatus::ok;
}

void qvColorARGBToBGR4(const QvFrame& in, QvFrame& out) {
    QV_ASSERT(in.inited() && in.four_cc() == QvFourcc::ARGB);
    takeShape(out, QvFourcc::BGR4, in);
    reversePixels(in, out);
}

void qvColorBGR4ToARGB(const QvFrame& in, QvFrame& out) {
    QV_ASSERT(in.inited() && qvEqualFourcc(in.four_cc(), QvFourcc::BGR4));
    takeShape(out, QvFourcc::ARGB, in);
    reversePixels(in, out);
}

void qvColorYUYVToI422(const QvFrame& in, QvFrame& out) {
    QV_ASSERT(in.inited());
    takeShape(out, QvFourcc::I422, in);
    const QvScalePicture source = pictureOf(in);
    QvScalePicture target = pictureOf(out);
    const unsigned flags = in.framerate.interlaced() ? QvScale::interlaced : 0;
    const int done =
        SRScaler(0, source.tag, &source, 0, 0, 0, target.tag, &target, 0, 0, 0, 0, flags, nullptr);
    QV_ASSERT_MSG(done == 1, "SRScaler() failed");
}

void qvColorYUYVToV210(const QvFrame& in, unsigned char* dest, QvFrame& scratch) {
    qvColorYUYVToI422(in, scratch);
    const auto lineBytes = static_cast<int>(qvDefaultStride(*qvPixelFormat(QvFourcc::v210), scratch.width()));
    const int groups = scratch.width() / groupPixels, rest = scratch.width() - groups * groupPixels;
    if (groups > 0) {
        QvScalePicture whole = pictureOf(scratch);
        whole.width = groups * groupPixels;
        const int done = SRScaler(0, whole.tag, &whole, 0, 0, 0, QvFourcc::v210, dest, lineBytes, whole.width,
                                  whole.height, 0, 0, nullptr);
        QV_ASSERT_MSG(done == 1, "SRScaler() failed");
    }
    for (int y = 0; y < scratch.height(); ++y)
        std::memset(dest + static_cast<std::ptrdiff_t>(lineBytes) * y + groups * groupBytes, 0,
                    static_cast<size_t>(rest));
}
