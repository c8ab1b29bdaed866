#include "builtin/sound/effects/audiodelay.h"

#include <cstring>

#include "builtin/creators.h"
#include "core/engine/log/qvlog.h"
#include "core/measure/qvgeometry.h"

namespace {

using Settings = AudioDelaySettings;

constexpr const char* tag = "adelay::writepcm";
constexpr int bitsPerByte = 8;

constexpr QvParamRow<Settings> rows[] = {
    {.name = "delay",
     .member = &Settings::delay,
     .flags = qvParamStored,
     .unit = "ms",
     .help = "how much later the sound comes; below 0 the input's beginning is skipped instead"},
};
static_assert(qvParamTableOk<Settings>(rows));

}  // namespace

QvCodec* newAdelay() { return new QvADelay; }

QvADelay::QvADelay() : SoundFilterOf(tag, rows) {}

int QvADelay::open() {
    if (const int result = SoundFilter::open()) return result;
    qv_dbg()->info("Opening audio delay, delay is %dms", settings_.delay);
    started_ = false;
    return QvStatus::ok;
}

int QvADelay::close() {
    line_.destroy();
    return SoundFilter::close();
}

void QvADelay::store(AnyDict& dict) const {
    SoundFilter::store(dict);
    qvStoreParamRows<Settings>(rows_, settings_, dict);
}

int QvADelay::restore(const AnyDict& dict) {
    if (const int result = SoundFilter::restore(dict)) return result;
    return dict.get("delay").isInt32() ? setParam("delay", dict.get("delay")) : QvStatus::ok;
}

int QvADelay::write(QvPcm& pcm) {
    requireOpened();
    const QvPcmFormat format{pcm.samplerate(), pcm.channels(), pcm.bytesPerSample() * bitsPerByte};
    if (!started_) delaying_ = false;
    if (!started_ && settings_.delay > 0 && format.samplerate > 0) {
        const MediaTime delay(settings_.delay / 1000.0, MediaTime::defaultTimescale);
        const long long samples = delay.position(format.samplerate);
        qv_dbg()->info("Audio delay is %lld samples at%dHz", samples, format.samplerate);
        delaying_ = samples > 0;
        if (delaying_) line_.start(samples, format);
    }
    started_ = true;
    unsigned char* room = nullptr;
    if (const int result = makeRoom(format, pcm.samples(), room)) return result;
    if (room && pass(pcm, room) != QvStatus::ok) {
        output_.setSamples(output_.samples() - pcm.samples());
        return setError(QvStatus::outOfMemory, "[%s]failed to allocate space for %d samples", tag,
                        pcm.samples());
    }
    output_.copyMeta(pcm);
    return QvStatus::ok;
}

int QvADelay::pass(const QvPcm& pcm, unsigned char* room) {
    if (delaying_) return line_.exchange(pcm.ptr(0), room, pcm.samples());
    std::memcpy(room, pcm.ptr(0), static_cast<std::size_t>(pcm.bytes()));
    return QvStatus::ok;
}
