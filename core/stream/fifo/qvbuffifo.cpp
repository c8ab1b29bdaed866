#include "core/stream/fifo/qvbuffifo.h"

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/stream/fifo/fifoobject_p.h"
#include "core/stream/observers_p.h"

namespace {

constexpr int defaultSize = 0x200000;
constexpr int defaultChunk = 0x40001;
constexpr char initFailed[] = "Fifo init failed";

void tellObservers(void* stream, unsigned offset, unsigned id, void* info, unsigned size) {
    notifyObservers(static_cast<QvBufStream*>(stream)->observers(), offset, id, info, size);
}

struct PlainFifo {
    FifoObject fifo;
};

void discardAll(bufstream* out) { out->confirm(out, out->usable(out)); }

}  // namespace

// QvBufStreamFifo

QvBufStreamFifo::QvBufStreamFifo(QvCodec* owner) : QvBufStream(owner) {}

QvBufStreamFifo::~QvBufStreamFifo() { QvBufStreamFifo::destroy(0); }

int QvBufStreamFifo::init(const AnyDict& newParams) {
    if (inited()) destroy(0);
    QvBufStream::init(newParams);
    const int size = int32Param("size", defaultSize);
    const int chunk = int32Param("chunk", defaultChunk);
    QV_ASSERT_MSG(chunk >= 0 && size >= chunk, initFailed);
    object_ = makeObject(static_cast<unsigned>(size), static_cast<unsigned>(chunk));
    QV_ASSERT_MEMORY(object_, initFailed);
    object_->notify = tellObservers;
    object_->listener = static_cast<QvBufStream*>(this);
    setInited(true);
    return 0;
}

FifoObjectPtr QvBufStreamFifo::makeObject(unsigned size, unsigned chunk) {
    return fifoMake<PlainFifo>(size, chunk);
}

void QvBufStreamFifo::destroy(int) {
    object_.reset();
    setInited(false);
}

void QvBufStreamFifo::flush() { discardAll(output()); }

bufstream* QvBufStreamFifo::input() {
    QV_ASSERT_MSG(inited(), "not inited");
    return &object_->in;
}

bufstream* QvBufStreamFifo::output() {
    QV_ASSERT_MSG(inited(), "not inited");
    return &object_->out;
}

int QvBufStreamFifo::registerObserver(QvAuxInfoObserver* observer) {
    return addObserver(observers_, observer);
}
int QvBufStreamFifo::unregisterObserver(QvAuxInfoObserver* observer) {
    return removeObserver(observers_, observer);
}
int QvBufStreamFifo::unregisterAllObservers() {
    observers_.clear();
    return 0;
}
TPtrList<QvAuxInfoObserver>* QvBufStreamFifo::observers() { return &observers_; }

// QvBufStreamFifoCb

namespace {

struct CallbackFifo {
    FifoObject fifo;
    QvBufStreamFifoCb* stream;
    unsigned written;    // bytes since the last call
    unsigned threshold;  // bytes
    bool stopped;
};

CallbackFifo* callbackOf(bufstream* bs) { return reinterpret_cast<CallbackFifo*>(fifoOf(bs)); }

// The counter is cleared before the call too: a consumer that throws must not be called again with old bytes.
void countWritten(CallbackFifo* cb, unsigned n) {
    cb->written += n;
    if (cb->written < cb->threshold) return;
    const unsigned bytes = cb->written;
    cb->written = 0;
    cb->stream->cbProgress(static_cast<int>(bytes));
}

unsigned char* cbRequest(bufstream* bs, unsigned n) {
    if (callbackOf(bs)->stopped) return nullptr;
    fifoOf(bs)->ring->rewindIfEmpty();
    return FifoOps::inRequest(bs, n);
}

unsigned cbConfirm(bufstream* bs, unsigned n) {
    const unsigned done = FifoOps::inConfirm(bs, n);
    countWritten(callbackOf(bs), done);
    return done;
}

unsigned cbCopy(bufstream* bs, unsigned char* p, unsigned n) {
    if (callbackOf(bs)->stopped) return 0;
    fifoOf(bs)->ring->rewindIfEmpty();
    const unsigned done = FifoOps::inCopy(bs, p, n);
    countWritten(callbackOf(bs), done);
    return done;
}

void cbTell(void* stream, unsigned offset, unsigned id, void* info, unsigned size) {
    static_cast<QvBufStreamFifoCb*>(stream)->cbAuxinfo(offset, id, info, size);
}

}  // namespace

QvBufStreamFifoCb::QvBufStreamFifoCb(QvCodec* owner) : QvBufStream(owner) {}

QvBufStreamFifoCb::~QvBufStreamFifoCb() { QvBufStreamFifoCb::destroy(0); }

int QvBufStreamFifoCb::init(const AnyDict& newParams) {
    if (inited()) destroy(0);
    QvBufStream::init(newParams);
    const int size = int32Param("size", defaultSize);
    const int chunk = int32Param("chunk", defaultChunk);
    const int threshold = int32Param("callback", size / 5);
    QV_ASSERT_MSG(chunk >= 0 && size >= chunk, initFailed);
    object_ = fifoMake<CallbackFifo>(static_cast<unsigned>(size), static_cast<unsigned>(chunk));
    QV_ASSERT_MEMORY(object_, initFailed);
    CallbackFifo* cb = callbackOf(&object_->in);
    cb->stream = this;
    cb->threshold = static_cast<unsigned>(threshold);
    cb->fifo.in.request = cbRequest;
    cb->fifo.in.confirm = cbConfirm;
    cb->fifo.in.copybytes = cbCopy;
    cb->fifo.notify = cbTell;
    cb->fifo.listener = this;
    setInited(true);
    return 0;
}

void QvBufStreamFifoCb::destroy(int) {
    object_.reset();
    setInited(false);
}

void QvBufStreamFifoCb::flush() { discardAll(QvBufStreamFifoCb::output()); }

bufstream* QvBufStreamFifoCb::input() {
    QV_ASSERT_MSG(object_, "not inited");
    return &object_->in;
}

bufstream* QvBufStreamFifoCb::output() {
    QV_ASSERT_MSG(object_, "not inited");
    return &object_->out;
}

void QvBufStreamFifoCb::cbAuxinfo(unsigned, unsigned, void*, unsigned) {}

void QvBufStreamFifoCb::stopProcessing() {
    qv_log()->error("Fifo can not continue processing, stopping");
    if (object_) callbackOf(&object_->in)->stopped = true;
}
