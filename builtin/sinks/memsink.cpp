#include "builtin/sinks/memsink.h"

#include "builtin/creators.h"

MemSink::~MemSink() { stream_.destroy(1); }

int MemSink::open() {
    if (getState() == stateCreated || running_)
        return setError(QvStatus::illegalState, "%s: illegal state", "open");
    stream_.setOutputQueue(&queue_);
    if (const int result = stream_.init()) return setError(result, "Failed to init bufstream object");
    running_ = true;
    setState(qvStateOpen);
    return QvStatus::ok;
}

int MemSink::close() {
    if (!running_) return QvStatus::ok;
    stream_.destroy(0);
    running_ = false;
    return QvStatus::ok;
}

QvBufStream* MemSink::stream() const { return &stream_; }

void* MemSink::getInterface(int kind) const {
    if (kind == qvOutputQueueInterface) return static_cast<QvAuQueuePoll*>(&queue_);
    return FilelessSink::getInterface(kind);
}

QvCodec* newMemsink() { return new MemSink; }
