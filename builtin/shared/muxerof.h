// The multiplexer that an encoder's output belongs to.
#pragma once

#include "core/encode/qvmuxer.h"
#include "core/engine/modules/qvmodule.h"
#include "core/stream/qvbufstrm.h"

// A stream knows its writer (the attachee) and its maker (the owner); either may be the multiplexer,
// the attachee before an encoder has taken its place. Null for neither.
inline QvMuxer* qvMuxerOf(const QvBufStream& stream) {
    for (auto* codec : {stream.atachee(), stream.owner()})
        if (codec && codec->getInterface(QvModuleType::muxer))
            return static_cast<QvMuxer*>(codec->getInterface(QvModuleType::muxer));
    return nullptr;
}
