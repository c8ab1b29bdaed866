#include "core/caption/bandconverter_p.h"

#include "core/engine/qvlog.h"
#include "core/engine/qvregistry.h"
#include "core/engine/status.h"
#include "core/filter/qvfilter.h"
#include "core/media/qvframe.h"

namespace {

constexpr int videoFilterInterface = 12;

}  // namespace

BandConverter::BandConverter() = default;
BandConverter::~BandConverter() = default;

bool BandConverter::open(unsigned fourcc, int width, int height) {
    filter_ = nullptr;
    if (!codec_) codec_.reset(qv_registry()->newCodec("scaler"));
    if (!codec_) return false;
    codec_->close();
    auto* filter = static_cast<QvVideoFilter*>(codec_->getInterface(videoFilterInterface));
    filter->setParam("outWidth", width);
    filter->setParam("outHeight", height);
    filter->setParam("FOURCC", static_cast<int>(fourcc));
    if (filter->open() != QvStatus::ok) return false;
    filter_ = filter;
    fourcc_ = fourcc;
    width_ = width;
    height_ = height;
    return true;
}

bool BandConverter::convert(const QvFrame& band, unsigned fourcc, QvFrame& out) {
    const bool fits = filter_ && fourcc_ == fourcc && width_ == band.width() && height_ == band.height();
    if (!fits && !open(fourcc, band.width(), band.height())) return fail(fourcc);
    QvFrame input(band);
    if (filter_->write(input) != QvStatus::ok || filter_->ready() < 1) return fail(fourcc);
    out = *filter_->frame();
    filter_->next();
    return true;
}

bool BandConverter::fail(unsigned fourcc) {
    if (!failed_) qv_dbg()->error("Text can't be drawn on %s", qvFourccText(fourcc).data());
    failed_ = true;
    return false;
}
