#include "builtin/video/frames/carrieddata.h"

#include <utility>

#include "core/engine/status.h"
#include "core/media/qvframe.h"

void CarriedData::addUserData(const QvFrame& frame) {
    if (const QvUserData* data = frame.userData()) packets_.extend(*data);
}

void CarriedData::addCaptions(const QvFrame& frame) {
    QvCcData captions;
    if (frame.subpic() && captions.restore(*frame.subpic()) == QvStatus::ok) captions_.extend(captions);
}

void CarriedData::giveUserData(QvFrame& frame) {
    std::swap(packets_, given_);
    packets_.clear();
    if (given_.empty())
        frame.clearUserData();
    else
        frame.setUserData(&given_);
}

void CarriedData::giveCaptions(QvFrame& frame) {
    frame.clearSubpic();
    if (captions_.count() == 0) return;
    AnyDict block;
    captions_.store(block);
    frame.setSubpic(block);
    captions_.clear();
}

void CarriedData::clear() {
    packets_.clear();
    given_.clear();
    captions_.clear();
}
