#include "builtin/muxers/nullmux.h"

#include <cstring>

#include "builtin/creators.h"
#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"
#include "core/stream/file/qvfilebufstream.h"

void NullMux::getParam(const char* name, Any& value) const {
    if (std::strcmp(name, "maxStreams") == 0)
        value = AnyDict("vids", 99, "auds", 99, "subs", 99, "total", 99);
    else
        OwnFilesMuxer::getParam(name, value);
}

QvBufStream* NullMux::addStream(int type, const AnyDict& params) {
    auto made = std::make_unique<QvNullBufStream>(this);
    if (made->init(params) != 0) {
        setError(QvStatus::failed, "init failed");
        return nullptr;
    }
    return keep(type, std::move(made));
}

int NullMux::open() {
    QV_ASSERT_MSG(getState() == stateInitialised, "[nullmux] Invalid state");
    for (const int type : streamTypes)
        for (int nr = 0; nr < nrStreams(type); ++nr) stream(type, nr)->reset();
    if (!anyEnabled()) {
        qv_dbg()->error("NullMux: no enabled streams!");
        QV_FAIL("NullMux: no enabled streams!");
    }
    setState(qvStateOpen);
    return QvStatus::ok;
}

int NullMux::close() {
    if (getState() == qvStateOpen) setState(stateInitialised);
    return QvStatus::ok;
}

QvCodec* newNullmux() { return new NullMux; }
