// What a multiplexer asks of the encoder that writes to one of its streams.
#pragma once

#include "core/engine/modules/qvcodec.h"
#include "core/value/anycontainer.h"

class QvBufStream;
class QvMuxer;

int qvIntParam(const QvCodec& codec, const char* name, int fallback);
// The encoder's "extension", else that of the stream, else `fallback`.
Any qvStreamExtension(QvBufStream& stream, const char* fallback);
// What a multiplexer answers from its encoders and its name: kilobytes a second of all of them, and the
// codecs of a kind (7 video, 6 audio) that go with it.
double qvEstimateSecKb(const QvMuxer& muxer);
AnyVector qvMuxerCodecs(const QvMuxer& muxer, int kind);
