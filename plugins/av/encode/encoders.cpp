#include "plugins/av/encode/encoders.h"

#include "plugins/av/encode/soundenc.h"
#include "plugins/av/encode/videoenc.h"

namespace av {

QvCodec* newEncoder(const char* module) {
    if (const VideoCodec* const row = videoCodec(module)) return new VideoEnc(*row);
    if (const SoundCodec* const row = soundCodec(module)) return new SoundEnc(*row);
    return nullptr;
}

}  // namespace av
