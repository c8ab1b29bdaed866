// The FIFOs: a ring of bytes between a writer and a reader, with records for both.
//
// Parameters, stored back with their defaults: "size", ring size in bytes (Int32, 2,097,152), and "chunk",
// largest contiguous block plus one (Int32, 262,145, at most "size").
//
// A full ring refuses, it never waits. Writers ask usable() first and keep one byte free: a write that fills
// the ring to the last byte makes it read as empty.
#pragma once

#include <memory>

#include "core/stream/qvbufstrm.h"

struct FifoObject;

struct QV_API FifoObjectDeleter {
    void operator()(FifoObject* object) const;
};
using FifoObjectPtr = std::unique_ptr<FifoObject, FifoObjectDeleter>;

// For one thread, or for a writer and a reader with a protocol of their own.
class QV_API QvBufStreamFifo : public QvBufStream {
  public:
    explicit QvBufStreamFifo(QvCodec* owner = nullptr);
    ~QvBufStreamFifo() override;

    using QvBufStream::init;
    // Asserts a "chunk" above "size"; without memory the assertion is a QvMemoryFailure. Not inited then.
    int init(const AnyDict& params) override;
    void destroy(int abort) override;  // what is buffered is lost
    void flush() override;             // throws away what is buffered
    bufstream* input() override;       // asserts a FIFO that is not inited
    bufstream* output() override;      // likewise
    // -1 for one that is registered already (logged), or is not there.
    int registerObserver(QvAuxInfoObserver* observer) override;
    int unregisterObserver(QvAuxInfoObserver* observer) override;
    int unregisterAllObservers() override;
    TPtrList<QvAuxInfoObserver>* observers() override;

  protected:
    // Makes the object with its ring; null if there is no memory or the sizes don't fit.
    virtual FifoObjectPtr makeObject(unsigned size, unsigned chunk);

  private:
    FifoObjectPtr object_;
    TPtrList<QvAuxInfoObserver> observers_;
};

// A FIFO that is drained in the writer's own thread: each time "callback" bytes (Int32, default a fifth of
// "size") have been written, cbProgress is called and reads them from output().
class QV_API QvBufStreamFifoCb : public QvBufStream {
  public:
    explicit QvBufStreamFifoCb(QvCodec* owner = nullptr);
    ~QvBufStreamFifoCb() override;

    using QvBufStream::init;
    int init(const AnyDict& params) override;
    void destroy(int abort) override;
    void flush() override;
    bufstream* input() override;
    bufstream* output() override;

    virtual void cbProgress(int bytes) = 0;  // bytes written since the last call
    virtual void cbAuxinfo(unsigned offset, unsigned id, void* info, unsigned size);

    // Logs, and refuses all further blocks and bytes: how the writer learns that a consumer has failed.
    void stopProcessing();

  private:
    FifoObjectPtr object_;
};

// A FIFO for finding faults. "global_lock" true: all operations of all such FIFOs exclude each other. "log"
// true: each operation is logged (progress level) with the threads that write and read.
class QV_API QvBufFifoDbg : public QvBufStreamFifo {
  public:
    using QvBufStreamFifo::QvBufStreamFifo;

  protected:
    FifoObjectPtr makeObject(unsigned size, unsigned chunk) override;
};
