#include "builtin/muxers/ownfilesmuxer.h"

#include "builtin/shared/donothing.h"

int OwnFilesMuxer::attachOutStream(QvBufStream* stream) {
    if (const int result = BaseMuxer::attachOutStream(stream)) return result;
    stream->setParam(qvSinkDoNothing, 1);
    return QvStatus::ok;
}

int OwnFilesMuxer::detachOutStream() {
    if (outStream()) outStream()->setParam(qvSinkDoNothing, 0);
    return BaseMuxer::detachOutStream();
}
