// Contract of a sink: where the output stream of a multiplexer ends.
#pragma once

#include "core/encode/codecstate.h"
#include "core/engine/modules/qvcodec.h"
#include "core/engine/status.h"

class QvBufStream;

class QV_API QvSink : public QvCodec {
  public:
    explicit QvSink(const QvModule* module = nullptr) : QvCodec(module) {}

    // The stream to attach to the multiplexer: the sink's, and the same object until its destruction.
    virtual QvBufStream* stream() const = 0;
    // Writes out what is buffered. Base: 0.
    virtual int flush();
    // Ends without finishing the output. Base: close().
    virtual int abort();

    void* getInterface(int kind) const override;
};

// getInterface number under which a sink hands out its QvAuQueuePoll, for one that has a queue.
constexpr int qvOutputQueueInterface = 19;
