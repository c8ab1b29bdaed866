#include "core/job/streamformat.h"

#include "core/value/anycontainer.h"

VideoFormat::VideoFormat(const AnyDict& stream)
    : fourcc(static_cast<unsigned>(stream.getInt32("FOURCC", 0))),
      width(stream.getInt32("width", 0)),
      height(stream.getInt32("height", 0)),
      frameAspect(stream.getDouble("frameAspect", 1.0)),
      frames(stream.getInt32("frames", 0)) {
    if (const Any& rate = stream.get("framerate"); rate.isFramerate()) framerate = rate.asFramerate();
}

AudioFormat::AudioFormat(const AnyDict& stream)
    : samplerate(stream.getInt32("samplerate", 0)),
      channels(stream.getInt32("channels", 0)),
      bits(stream.getInt32("bitsPerSample", defaultBits)),
      samples(stream.getInt64("samples", unknownLength)) {}
