// The entries of "av_codecs.so".
#include <cstring>

#include "core/arch/api.h"
#include "plugins/av/decoder/avdec.h"
#include "plugins/av/encode/encoders.h"
#include "plugins/av/mux/multiplexer.h"
#include "plugins/av/source/librarylog.h"

extern "C" QV_API QvCodec* av_create_codec(const char* module) {
    av::sendLibraryLog();
    if (std::strcmp(module, "avdec") == 0) return new av::AvDec;
    QvCodec* const encoder = av::newEncoder(module);
    return encoder ? encoder : av::newMultiplexer(module);
}

extern "C" QV_API void av_leave() { av::resetLibraryLog(); }
