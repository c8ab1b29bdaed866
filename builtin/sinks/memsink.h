// MemSink: an output that ends in a queue of access units, which an application polls. Module "memsink".
#pragma once

#include "builtin/sinks/filelesssink.h"
#include "core/engine/modules/qvmodule.h"
#include "core/stream/fifo/qvbufmem.h"

// getInterface(qvOutputQueueInterface) answers the QvAuQueuePoll. The queue lives as long as the sink, so
// what was encoded can still be fetched after close. Any thread may poll while another encodes.
class MemSink : public FilelessSink {
  public:
    MemSink() = default;
    ~MemSink() override;

    // QvStatus::illegalState while it is open.
    int open() override;
    // The state stays; the sink can be opened again.
    int close() override;
    QvBufStream* stream() const override;
    void* getInterface(int kind) const override;

  private:
    mutable QvAuxinfoQueue queue_;
    mutable QvMemOutStream stream_{this};
    bool running_ = false;
};
