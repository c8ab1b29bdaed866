#include "core/stream/fifo/qvbufmem.h"

#include <algorithm>
#include <deque>

#include "core/arch/qvassert.h"
#include "core/engine/status.h"
#include "core/engine/threads/qvthreads.h"
#include "core/stream/fifo/bufmemout_p.h"

QvAuQueuePoll::~QvAuQueuePoll() = default;

struct QvAuxinfoQueue::Imp {
    std::deque<QvAuxinfoData> items;
    QVThreads::QvCriticalSection section;
};

QvAuxinfoQueue::QvAuxinfoQueue() : imp_(std::make_unique<Imp>()) {}
QvAuxinfoQueue::~QvAuxinfoQueue() = default;

int QvAuxinfoQueue::hasData() const {
    QVThreads::QvLock guard(&imp_->section);
    return imp_->items.empty() ? 0 : 1;
}

QvAuxinfoData QvAuxinfoQueue::popData() {
    QVThreads::QvLock guard(&imp_->section);
    QV_ASSERT(!imp_->items.empty());
    QvAuxinfoData oldest = imp_->items.front();
    imp_->items.pop_front();
    return oldest;
}

int QvAuxinfoQueue::pushData(const QvAuxinfoData& item) {
    QVThreads::QvLock guard(&imp_->section);
    imp_->items.push_back(item);
    return QvStatus::ok;
}

void QvAuxinfoQueue::lock() { imp_->section.enter(); }
void QvAuxinfoQueue::unlock() { imp_->section.leave(); }

QvMemOutStream::QvMemOutStream(QvCodec* owner) : QvBufStream(owner) {}
QvMemOutStream::~QvMemOutStream() = default;

void QvMemOutStream::setOutputQueue(QvAuxinfoQueue* queue) {
    setParam("outputQueue", Any(static_cast<const void*>(queue), 0));
}

int QvMemOutStream::init(const AnyDict& newParams) {
    QvBufStream::init(newParams);
    out_.reset();
    const Any& queue = params().get("outputQueue");
    if (!queue.isGeneric() || queue.size() != 0 || !queue.asGeneric()) return QvStatus::illegalState;
    const int size = std::max(params().getInt32("size"), 0);
    out_ = std::make_unique<BufMemOut>(static_cast<QvAuxinfoQueue*>(queue.asGeneric()),
                                       static_cast<unsigned>(size));
    if (const int status = out_->init()) {
        out_.reset();
        return status;
    }
    setInited(true);
    return QvStatus::ok;
}

void QvMemOutStream::destroy(int) {
    out_.reset();
    setInited(false);
}

bufstream* QvMemOutStream::input() { return out_ ? out_->record() : nullptr; }
bufstream* QvMemOutStream::output() { return nullptr; }
