#include "builtin/muxers/memmux.h"

#include <algorithm>

#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/arch/undo_p.h"
#include "core/stream/fifo/qvbufmem.h"

QvBufStream* MemMux::addStream(int type, const AnyDict& params) {
    if (getState() != stateInitialised) {
        setError(QvStatus::illegalState, "%s: illegal state", "addStream");
        QV_FAIL(errorDesc());
    }
    if (std::find(streamTypes.begin(), streamTypes.end(), type) == streamTypes.end()) {
        setError(QvStatus::invalidStructure, "Invalid stream type");
        return nullptr;
    }
    auto made = std::make_unique<QvMemOutStream>(this);
    made->setParamDict(params);
    return keep(type, std::move(made));
}

int MemMux::open() {
    if (getState() != stateInitialised) return setError(QvStatus::illegalState, "%s: illegal state", "open");
    const Any queue = outStream() ? outStream()->getParam("outputQueue") : Any();
    if (!queue.isGeneric() || !queue.asGeneric())
        return setError(QvStatus::failed, "The sink has no output queue");
    Undo ending([this] { end(); });
    for (const int type : streamTypes)
        for (int nr = 0; nr < nrStreams(type); ++nr) {
            stream(type, nr)->setParam("outputQueue", queue);
            if (const int result = stream(type, nr)->init())
                return setError(result, "Failed to init bufstream object");
        }
    ending.dismiss();
    setState(qvStateOpen);
    return QvStatus::ok;
}

int MemMux::close() {
    if (getState() != qvStateOpen) return QvStatus::ok;
    end();
    setState(stateInitialised);
    return QvStatus::ok;
}

void MemMux::end() {
    for (const int type : streamTypes)
        for (int nr = 0; nr < nrStreams(type); ++nr) stream(type, nr)->destroy(0);
}

QvCodec* newMemmux() { return new MemMux; }
