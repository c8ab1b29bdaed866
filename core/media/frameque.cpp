#include "core/media/frameque.h"

#include "core/arch/qvassert.h"
#include "core/engine/status.h"

namespace {

// The frame keeps its address and nothing is allocated.
void moveHead(std::list<QvFrame>& from, std::list<QvFrame>& to) {
    QV_ASSERT(!from.empty());
    to.splice(to.end(), from, from.begin());
}

QvFrame* head(std::list<QvFrame>& side) { return side.empty() ? nullptr : &side.front(); }

}  // namespace

int QvFrameQue::init(int count) {
    for (int i = 0; i < count; ++i) empty_.emplace_back();
    return QvStatus::ok;
}

void QvFrameQue::destroy() {
    empty_.clear();
    full_.clear();
}

QvFrame* QvFrameQue::emptyBuffer() { return head(empty_); }

QvFrame* QvFrameQue::fullBuffer() { return head(full_); }

void QvFrameQue::moveToFull() { moveHead(empty_, full_); }

void QvFrameQue::moveToEmpty() { moveHead(full_, empty_); }
