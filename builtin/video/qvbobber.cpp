#include "builtin/video/qvbobber.h"

#include <algorithm>
#include <limits>

#include "builtin/creators.h"
#include "builtin/video/bobrows.h"
#include "builtin/video/fields.h"
#include "core/engine/qvlog.h"
#include "core/media/qvgeometry.h"

namespace {

constexpr int mostAlpha = 255;

constexpr QvParamRow<BobberSettings> rows[] = {
    {"alpha", &BobberSettings::alpha, qvParamStored, 0, mostAlpha,
     "share of the median of both fields in the missing lines; 0: plain line interpolation"},
};
static_assert(qvParamTableOk<BobberSettings>(rows));

// False if no rate is twice as high.
bool doubleRate(QvFramerate& rate) {
    QvRatio twice = rate.rate();
    if (twice.den % 2 == 0)
        twice.den /= 2;
    else if (twice.num > 0 && twice.num <= std::numeric_limits<int>::max() / 2)
        twice.num *= 2;
    else
        return false;
    rate.setRate(twice);
    rate.setInterlaced(0);
    return true;
}

// Makes the rows of `to` that its field lacks, from what `from` has in and between them.
void fillMissing(QvFrame& to, const QvFrame& from, Field field, int weight) {
    const auto samples = qvbob::samplesOf(from.four_cc());
    for (int p = 0; p < to.planes(); ++p) {
        const std::ptrdiff_t stride = from.stride(p), toStride = to.stride(p);
        if (stride <= 0 || toStride <= 0) continue;
        const auto count = std::min(from.plane_bytes(p) / stride, to.plane_bytes(p) / toStride);
        const auto bytes = static_cast<std::size_t>(std::min(stride, toStride));
        for (std::ptrdiff_t row = field == Field::top ? 1 : 0; row < count; row += 2) {
            const unsigned char* other = from.plane(p) + row * stride;
            const unsigned char* above = row > 0 ? other - stride : nullptr;
            const unsigned char* below = row + 1 < count ? other + stride : nullptr;
            if (!above && !below) above = below = other;
            qvbob::fillRow(samples, to.plane(p) + row * toStride, above ? above : below,
                           below ? below : above, other, weight, bytes);
        }
    }
}

int showField(QvFrame& to, const QvFrame& from, Field field, int weight) {
    if (const int status = beginWeave(to, from, field)) return status;
    fillMissing(to, from, field, weight);
    return doubleRate(to.framerate) ? QvStatus::ok : QvStatus::invalidArgument;
}

}  // namespace

QvCodec* newBobber() { return new QvBobber; }

QvBobber::QvBobber() : VideoEffectOf("bobber", rows) {}

void QvBobber::getParam(const char* name, Any& value) const {
    if (name && Any(name) == "_rateFactor")
        value = 2;
    else if (name && Any(name) == "_isFramerateConverter")
        value = 1;
    else
        VideoEffectOf::getParam(name, value);
}

int QvBobber::open() {
    started_ = false;
    left_ = 0;
    qv_dbg()->write("[bobber] opened");
    return VideoEffectOf::open();
}

int QvBobber::close() {
    left_ = 0;
    second_.destroy();
    return VideoEffectOf::close();
}

int QvBobber::write(QvFrame& frame) {
    left_ = 0;
    const int result = VideoEffectOf::write(frame);
    if (result == QvStatus::ok) left_ = 2;
    return result;
}

int QvBobber::fill(const QvFrame& frame) {
    const Field first = frame.framerate.interlaced() == 2 ? Field::bottom : Field::top;
    const int weight = settings_.alpha + (settings_.alpha + 1) / (mostAlpha + 1);  // 255 is the whole
    int status = showField(output_, frame, first, weight);
    if (status == QvStatus::ok) status = showField(second_, frame, otherField(first), weight);
    if (status != QvStatus::ok) return setError(status, "can not make two frames of one");
    if (!started_) nextNumber_ = 2LL * frame.frameNr;
    started_ = true;
    output_.frameNr = static_cast<int>(nextNumber_);
    second_.frameNr = static_cast<int>(nextNumber_ + 1);
    nextNumber_ += 2;
    second_.clearUserData();
    second_.clearSubpic();
    return QvStatus::ok;
}

int QvBobber::next() {
    left_ = std::max(left_ - 1, 0);
    return VideoEffectOf::next();
}
