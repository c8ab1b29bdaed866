#include "plugins/av/encode/encoders.h"

#include "core/engine/log/qvlog.h"
#include "plugins/av/encode/soundenc.h"
#include "plugins/av/encode/videoenc.h"

namespace av {

namespace {

// A module without its library is listed as one that is not usable.
bool hasLibrary(const AVCodec* library, const char* encoder) {
    if (!library) qv_dbg()->error("The installed libavcodec has no encoder %s", encoder);
    return library != nullptr;
}

}  // namespace

QvCodec* newEncoder(const char* module) {
    if (const VideoCodec* const row = videoCodec(module))
        return hasLibrary(row->library(), row->encoder) ? new VideoEnc(*row) : nullptr;
    if (const SoundCodec* const row = soundCodec(module))
        return !*row->encoder || hasLibrary(row->library(), row->encoder) ? new SoundEnc(*row) : nullptr;
    return nullptr;
}

}  // namespace av
