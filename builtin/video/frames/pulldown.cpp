#include "builtin/video/frames/pulldown.h"

#include <utility>

#include "builtin/video/frames/fields.h"
#include "core/engine/status.h"

namespace {

constexpr int phases = 4;

void clearData(QvFrame& frame) {
    frame.clearUserData();
    frame.clearSubpic();
}

void takeData(QvFrame& frame, const QvFrame& from) {
    clearData(frame);
    if (from.userData()) frame.setUserData(from.userData());
    if (from.subpic()) frame.setSubpic(*from.subpic());
}

}  // namespace

Pulldown::Pulldown(const QvFramerate& outRate)
    : outRate_(outRate), first_(std::make_unique<QvFrame>()), field_(std::make_unique<QvFrame>()) {
    outRate_.setInterlaced(1);
}

int Pulldown::write(const QvFrame& frame) {
    phase_ = phase_ % phases + 1;
    first_->frameNr = second_.frameNr = -1;
    const int status = writePhase(frame);
    first_->frameNr = second_.frameNr = -1;
    if (status != QvStatus::ok) return status;
    number(*first_, nextNumber_);
    if (phase_ == phases) number(second_, nextNumber_ + 1);
    return QvStatus::ok;
}

int Pulldown::writePhase(const QvFrame& frame) {
    switch (phase_) {
        case 1: return first_->copy(frame);
        case 2:
            if (const int status = first_->copy(frame)) return status;
            return beginWeave(*field_, frame, Field::top);
        case 3:
            if (const int status = mix(frame)) return status;
            return beginWeave(*field_, frame, Field::top);
        default:
            if (const int status = second_.copy(frame)) return status;
            clearData(second_);
            return mix(frame);
    }
}

// The top field that waits and the bottom field of the frame, which brings its data.
int Pulldown::mix(const QvFrame& frame) {
    if (const int status = endWeave(*field_, frame, Field::bottom)) return status;
    std::swap(first_, field_);
    takeData(*first_, frame);
    return QvStatus::ok;
}

void Pulldown::number(QvFrame& slot, long long number) const {
    slot.frameNr = static_cast<int>(number);
    slot.framerate = outRate_;
}

QvFrame* Pulldown::frame() {
    if (firstFull()) return first_.get();
    return secondFull() ? &second_ : nullptr;
}

void Pulldown::next() {
    if (ready() == 0) return;
    frame()->frameNr = -1;
    ++nextNumber_;
}
