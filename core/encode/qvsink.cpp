#include "core/encode/qvsink.h"

#include "core/engine/status.h"

int QvSink::flush() { return QvStatus::ok; }

int QvSink::abort() { return close(); }

void* QvSink::getInterface(int kind) const { return kind == 5 ? const_cast<QvSink*>(this) : nullptr; }
