#include "builtin/video/frames/qvbobber.h"

#include <algorithm>
#include <limits>

#include "builtin/creators.h"
#include "builtin/video/frames/bobrows.h"
#include "builtin/video/frames/fields.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"

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

// The rows around row `row` of a plane; a row that is not there is the one on the other side.
qvbob::Triple rowsAround(const QvFrame& frame, int plane, int row, int rows) {
    const std::ptrdiff_t stride = frame.stride(plane);
    const unsigned char* at = frame.plane(plane) + row * stride;
    const bool isFirst = row == 0, isLast = row + 1 >= rows;
    if (isFirst && isLast) return {at, at, at};
    return {isFirst ? at + stride : at - stride, at, isLast ? at - stride : at + stride};
}

// Makes the rows of `to` that its field lacks, from what `from` has in and between them.
void fillMissing(QvFrame& to, const QvFrame& from, const QvFrame* before, Field field, int weight) {
    const auto samples = qvbob::samplesOf(from.four_cc());
    for (int p = 0; p < to.planes(); ++p) {
        const RowShape shape = commonRows(to, from, p);
        const std::ptrdiff_t stride = to.stride(p);
        for (int row = field == Field::top ? 1 : 0; row < shape.rows; row += 2) {
            const auto now = rowsAround(from, p, row, shape.rows);
            const auto old = before ? rowsAround(*before, p, row, shape.rows) : qvbob::Triple();
            qvbob::fillRow(samples, to.plane(p) + row * stride, now, old, weight,
                           static_cast<std::size_t>(shape.bytes));
        }
    }
}

}  // namespace

QvCodec* newBobber() { return new QvBobber; }

QvBobber::QvBobber() : VideoEffectOf("bobber", rows) {}

void QvBobber::getParam(const char* name, Any& value) const {
    if (name && Any(name) == "_rateFactor")
        value = 2;
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
    before_.destroy();
    return VideoEffectOf::close();
}

int QvBobber::write(QvFrame& frame) {
    left_ = 0;
    const int result = VideoEffectOf::write(frame);
    if (result == QvStatus::ok) left_ = 2;
    return result;
}

int QvBobber::show(QvFrame& to, const QvFrame& frame, Field field) const {
    if (const int status = beginWeave(to, frame, field)) return status;
    const int weight = settings_.alpha + (settings_.alpha + 1) / (mostAlpha + 1);  // 255 is the whole
    fillMissing(to, frame, sameShape(before_, frame) ? &before_ : nullptr, field, weight);
    return doubleRate(to.framerate) ? QvStatus::ok : QvStatus::invalidArgument;
}

int QvBobber::fill(const QvFrame& frame) {
    const Field first = frame.framerate.interlaced() == 2 ? Field::bottom : Field::top;
    int status = show(output_, frame, first);
    if (status == QvStatus::ok) status = show(second_, frame, otherField(first));
    if (status == QvStatus::ok && settings_.alpha > 0) status = copyFields(before_, frame);
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
