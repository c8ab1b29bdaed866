// QvBufFifoDbg: the FIFO's operations with one lock around all such FIFOs and a log line each.
#include <atomic>
#include <cstdarg>
#include <cstdio>
#include <optional>

#include "core/engine/log/qvlog.h"
#include "core/engine/threads/qvthreads.h"
#include "core/stream/fifo/fifoobject_p.h"
#include "core/stream/fifo/qvbuffifo.h"

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

// The plain operations of a side, and what the log calls it and the count that is left to it.
struct Input {
    static constexpr char name[] = "fifow";
    static constexpr char left[] = "empty";
    static constexpr auto usable = FifoOps::inUsable;
    static constexpr auto request = FifoOps::inRequest;
    static constexpr auto confirm = FifoOps::inConfirm;
    static constexpr auto copy = FifoOps::inCopy;
    static constexpr auto aux = FifoOps::inAux;
};
struct Output {
    static constexpr char name[] = "fifor";
    static constexpr char left[] = "full";
    static constexpr auto usable = FifoOps::outUsable;
    static constexpr auto request = FifoOps::outRequest;
    static constexpr auto confirm = FifoOps::outConfirm;
    static constexpr auto copy = FifoOps::outCopy;
    static constexpr auto aux = FifoOps::outAux;
};

template <class Side>
struct Traced {
    static unsigned char* request(bufstream* bs, unsigned n) {
        Operation op(bs);
        unsigned char* block = Side::request(bs, n);
        op.line("%s_request numSamples=%u, ret=%p, %s=%u", Side::name, n, static_cast<void*>(block),
                Side::left, Side::usable(bs));
        return block;
    }
    static unsigned confirm(bufstream* bs, unsigned n) {
        Operation op(bs);
        const unsigned done = Side::confirm(bs, n);
        op.line("%s_confirm numSamples=%u, ret=%u, %s=%u", Side::name, n, done, Side::left, Side::usable(bs));
        return done;
    }
    static unsigned copy(bufstream* bs, unsigned char* p, unsigned n) {
        Operation op(bs);
        const unsigned done = Side::copy(bs, p, n);
        op.line("%s_copybytes numSamples=%u, ret=%u, %s=%u", Side::name, n, done, Side::left,
                Side::usable(bs));
        return done;
    }
    static unsigned aux(bufstream* bs, unsigned offset, unsigned id, void* info, unsigned size) {
        Operation op(bs);
        op.line("%s_auxinfo id=%d (%s) size=%d", Side::name, static_cast<int>(id), qvAuxInfoName(id),
                static_cast<int>(size));
        return Side::aux(bs, offset, id, info, size);
    }
    static void install(bufstream& bs) {
        bs.request = request;
        bs.confirm = confirm;
        bs.copybytes = copy;
        bs.auxinfo = aux;
    }
};

}  // namespace

FifoObjectPtr QvBufFifoDbg::makeObject(unsigned size, unsigned chunk) {
    FifoObjectPtr object = fifoMake<DbgFifo>(size, chunk);
    if (!object) return object;
    DbgFifo* dbg = dbgOf(&object->in);
    if (params().get("global_lock").isTrue()) {
        dbg->lock = &globalLock();
        qv_dbg()->debug("buf_fifo @ %p: using global lock %p", static_cast<void*>(object.get()),
                        static_cast<void*>(dbg->lock));
    }
    if (params().get("log").isTrue()) {
        dbg->log = [](const char* text) { qv_dbg()->logs(QvLogMask::progress, text); };
        qv_dbg()->debug("buf_fifo @ %p: logging traffic", static_cast<void*>(object.get()));
    }
    Traced<Input>::install(object->in);
    Traced<Output>::install(object->out);
    return object;
}
