#include "builtin/sound/soundfilter.h"

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"

namespace {

constexpr auto stateOpen = static_cast<QvCodec::State>(3);
constexpr int bitsPerByte = 8;

}  // namespace

bool SoundFilter::opened() const { return getState() == stateOpen; }

void SoundFilter::requireInited() const { QV_ASSERT_MSG(getState() != stateCreated, "Not inited"); }

void SoundFilter::requireOpened() const { QV_ASSERT_MSG(opened(), "Not opened"); }

int SoundFilter::open() {
    requireInited();
    setState(stateOpen);
    return QvStatus::ok;
}

int SoundFilter::close() {
    output_.destroy();
    if (opened()) setState(stateInitialised);
    return QvStatus::ok;
}

int SoundFilter::makeRoom(const QvPcmFormat& format, int count, unsigned char*& room) {
    room = nullptr;
    const int bytes = (format.bitsPerSample + bitsPerByte - 1) / bitsPerByte;
    if (!output_.inited()) {
        if (output_.init(count, format.channels, bytes, format.samplerate) != QvStatus::ok)
            return setError(QvStatus::outOfMemory, "[%s]failed to allocate space for %d samples", tag_,
                            count);
    }
    if (output_.channels() != format.channels || output_.bytesPerSample() != bytes)
        return setError(
            QvStatus::failed, "the format of the sound changed from %d channels of %d bits to %d of %d",
            output_.channels(), output_.bytesPerSample() * bitsPerByte, format.channels, bytes * bitsPerByte);
    const int filled = output_.samples();
    const int missing = count - (output_.size() - filled);
    if (missing > 0 && output_.grow(missing) < 0)
        return setError(QvStatus::outOfMemory, "[%s]failed to allocate space for %d samples", tag_, count);
    output_.setSamples(filled + count);
    if (count > 0) room = output_.ptr(filled);
    return QvStatus::ok;
}
