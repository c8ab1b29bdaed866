// What a multiplexer asks of the encoder that writes to one of its streams.
#pragma once

#include "core/engine/qvcodec.h"

class QvBufStream;

bool qvIsCodec(const QvCodec* codec, const char* name);  // false for null
int qvIntParam(const QvCodec& codec, const char* name, int fallback);
// The encoder's "extension", else that of the stream, else `fallback`.
Any qvStreamExtension(QvBufStream& stream, const char* fallback);
