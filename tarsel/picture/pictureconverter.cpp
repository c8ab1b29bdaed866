#include "tarsel/picture/pictureconverter.h"

#include <new>

#include "tarsel/source/source.h"
#include "tarsel/words/messages.h"

namespace {

constexpr int kVideoFilter = 12;

}  // namespace

PictureConverter::PictureConverter(int width, int height, unsigned fourcc, const std::string& option)
    : scaler_(makeCodec<QvVideoFilter>("scaler", kVideoFilter)) {
    setChecked(*scaler_, "outWidth", width, option);
    setChecked(*scaler_, "outHeight", height, option);
    setChecked(*scaler_, "FOURCC", static_cast<int>(fourcc), option);
    if (scaler_->open() != QvStatus::ok) fail();
}

PictureConverter::~PictureConverter() { scaler_->close(); }

const QvFrame& PictureConverter::convert(const QvFrame& from) {
    in_ = from;
    if (!in_.inited()) throw std::bad_alloc();
    if (scaler_->write(in_) != QvStatus::ok || scaler_->ready() == 0) fail();
    out_ = *scaler_->frame();
    scaler_->next();
    if (!out_.inited()) throw std::bad_alloc();
    return out_;
}

void PictureConverter::fail() const {
    if (memory_.ranOut()) throw std::bad_alloc();
    throw failure(Msg::sheetFailed, {scaler_->errorDesc()});
}
