// QvBufFifoDbg: the FIFO's operations with one lock around all such FIFOs and a log line each.
#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <optional>

#include "core/engine/qvlog.h"
#include "core/engine/qvthreads.h"
#include "core/stream/fifoobject_p.h"
#include "core/stream/qvbuffifo.h"

namespace {

using Log = void (*)(const char* text);

struct DbgFifo {
    FifoObject fifo;
    QVThreads::QvCriticalSection* lock;  // null: none
    Log log;                             // null: none
    std::atomic<int> writer;             // threads that used the input and the output last
    std::atomic<int> reader;
};

DbgFifo* dbgOf(bufstream* bs) { return reinterpret_cast<DbgFifo*>(fifoOf(bs)); }

QVThreads::QvCriticalSection& globalLock() {
    static QVThreads::QvCriticalSection section;
    return section;
}

int currentThread() {
    static std::atomic<int> count{0};
    thread_local const int id = ++count;
    return id;
}

// One operation: excludes the others and notes the thread, and writes the line if there is a log.
class Operation {
  public:
    Operation(bufstream* bs) : fifo_(dbgOf(bs)) {
        if (fifo_->lock) guard_.emplace(fifo_->lock);
        (bs == &fifo_->fifo.in ? fifo_->writer : fifo_->reader).store(currentThread());
    }

    QV_PRINTF(2, 3) void line(const char* format, ...) {
        if (!fifo_->log) return;
        char text[256];
        const int head = std::snprintf(text, sizeof text, "TID %d TID_R %d TID_W %d: ", currentThread(),
                                       fifo_->reader.load(), fifo_->writer.load());
        va_list args;
        va_start(args, format);
        std::vsnprintf(text + head, sizeof text - static_cast<size_t>(head), format, args);
        va_end(args);
        fifo_->log(text);
    }

  private:
    DbgFifo* fifo_;
    std::optional<QVThreads::QvLock> guard_;
};

unsigned char* inRequest(bufstream* bs, unsigned n) {
    Operation op(bs);
    unsigned char* block = FifoOps::inRequest(bs, n);
    op.line("fifow_request numSamples=%u, ret=%p, empty=%u", n, static_cast<void*>(block),
            FifoOps::inUsable(bs));
    return block;
}

unsigned inConfirm(bufstream* bs, unsigned n) {
    Operation op(bs);
    const unsigned done = FifoOps::inConfirm(bs, n);
    op.line("fifow_confirm numSamples=%u, ret=%u, empty=%u", n, done, FifoOps::inUsable(bs));
    return done;
}

unsigned inCopy(bufstream* bs, unsigned char* p, unsigned n) {
    Operation op(bs);
    const unsigned done = FifoOps::inCopy(bs, p, n);
    op.line("fifow_copybytes numSamples=%u, ret=%u, empty=%u", n, done, FifoOps::inUsable(bs));
    return done;
}

unsigned inAux(bufstream* bs, unsigned offset, unsigned id, void* info, unsigned size) {
    Operation op(bs);
    op.line("fifow_auxinfo id=%d (%s) size=%d", static_cast<int>(id), qvAuxInfoName(id),
            static_cast<int>(size));
    return FifoOps::inAux(bs, offset, id, info, size);
}

unsigned char* outRequest(bufstream* bs, unsigned n) {
    Operation op(bs);
    unsigned char* block = FifoOps::outRequest(bs, n);
    op.line("fifor_request numSamples=%u, ret=%p, full=%u", n, static_cast<void*>(block),
            FifoOps::outUsable(bs));
    return block;
}

unsigned outConfirm(bufstream* bs, unsigned n) {
    Operation op(bs);
    const unsigned done = FifoOps::outConfirm(bs, n);
    op.line("fifor_confirm numSamples=%u, ret=%u, full=%u", n, done, FifoOps::outUsable(bs));
    return done;
}

unsigned outCopy(bufstream* bs, unsigned char* p, unsigned n) {
    Operation op(bs);
    const unsigned done = FifoOps::outCopy(bs, p, n);
    op.line("fifor_copybytes numSamples=%u, ret=%u, full=%u", n, done, FifoOps::outUsable(bs));
    return done;
}

unsigned outAux(bufstream* bs, unsigned offset, unsigned id, void* info, unsigned size) {
    Operation op(bs);
    op.line("fifor_auxinfo id=%d (%s) size=%d", static_cast<int>(id), qvAuxInfoName(id),
            static_cast<int>(size));
    return FifoOps::outAux(bs, offset, id, info, size);
}

}  // namespace

FifoObjectPtr QvBufFifoDbg::makeObject(unsigned size, unsigned chunk) {
    FifoObjectPtr object = fifoMake<DbgFifo>(size, chunk);
    if (!object) return object;
    bufstream& in = object->in;
    bufstream& out = object->out;
    DbgFifo* dbg = dbgOf(&in);
    if (params().get("global_lock").isTrue()) {
        dbg->lock = &globalLock();
        qv_dbg()->debug("buf_fifo @ %p: using global lock %p", static_cast<void*>(object.get()),
                        static_cast<void*>(dbg->lock));
    }
    if (params().get("log").isTrue()) {
        dbg->log = [](const char* text) { qv_dbg()->logs(QvLogMask::progress, text); };
        qv_dbg()->debug("buf_fifo @ %p: logging traffic", static_cast<void*>(object.get()));
    }
    in.request = inRequest;
    in.confirm = inConfirm;
    in.copybytes = inCopy;
    in.auxinfo = inAux;
    out.request = outRequest;
    out.confirm = outConfirm;
    out.copybytes = outCopy;
    out.auxinfo = outAux;
    return object;
}
