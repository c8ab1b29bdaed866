#include "builtin/sound/soundfilter.h"

#include <cstring>

#include "core/arch/qvassert.h"
#include "core/engine/log/qvlog.h"

namespace {

constexpr auto stateOpen = static_cast<QvCodec::State>(3);
constexpr int bitsPerByte = 8;
constexpr int wideBytes = 4;

}  // namespace

bool SoundFilter::opened() const { return getState() == stateOpen; }

void SoundFilter::requireInited() const { QV_ASSERT_MSG(getState() != stateCreated, "Not inited"); }

void SoundFilter::requireOpened() const { QV_ASSERT_MSG(opened(), "Not opened"); }

void SoundFilter::requireWide(const QvPcm& pcm) const {
    requireOpened();
    QV_ASSERT_MSG(pcm.bytesPerSample() == wideBytes, "Only 32 bit samples supported");
}

void SoundFilter::getParam(const char* name, Any& value) const {
    if (maxChannels() > 0 && std::strcmp(name, "_maxChannels") == 0)
        value = maxChannels();
    else
        QvAudioFilter::getParam(name, value);
}

void SoundFilter::warnOfSilence(int channels) {
    if (warned_ || channels <= maxChannels()) return;
    warned_ = true;
    qv_log()->warning("%s: only the first %d of %d channels are written, the others are silent", name(),
                      maxChannels(), channels);
}

int SoundFilter::open() {
    requireInited();
    warned_ = false;
    setState(stateOpen);
    return QvStatus::ok;
}

int SoundFilter::close() {
    output_.destroy();
    if (opened()) setState(stateInitialised);
    return QvStatus::ok;
}

int SoundFilter::makeRoom(QvPcm& buffer, const QvPcmFormat& format, int count, unsigned char*& room) {
    room = nullptr;
    const int bytes = (format.bitsPerSample + bitsPerByte - 1) / bitsPerByte;
    if (!buffer.inited()) {
        if (buffer.init(count, format.channels, bytes, format.samplerate) != QvStatus::ok)
            return setError(QvStatus::outOfMemory, "[%s]failed to allocate space for %d samples", tag_,
                            count);
    }
    if (buffer.channels() != format.channels || buffer.bytesPerSample() != bytes)
        return setError(
            QvStatus::failed, "the format of the sound changed from %d channels of %d bits to %d of %d",
            buffer.channels(), buffer.bytesPerSample() * bitsPerByte, format.channels, bytes * bitsPerByte);
    const int filled = buffer.samples();
    const int missing = count - (buffer.size() - filled);
    if (missing > 0 && buffer.grow(missing) < 0)
        return setError(QvStatus::outOfMemory, "[%s]failed to allocate space for %d samples", tag_, count);
    buffer.setSamples(filled + count);
    if (count > 0) room = buffer.ptr(filled);
    return QvStatus::ok;
}

int SoundFilter::makeWideRoom(const QvPcm& like, int channels, int32_t*& room) {
    unsigned char* bytes = nullptr;
    const int result =
        makeRoom({like.samplerate(), channels, wideBytes * bitsPerByte}, like.samples(), bytes);
    room = reinterpret_cast<int32_t*>(bytes);
    return result;
}
