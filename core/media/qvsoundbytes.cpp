#include "core/media/qvsoundbytes.h"

#include <array>
#include <cstddef>
#include <memory>
#include <new>
#include <span>

#include <zlib.h>

#include "core/arch/qvassert.h"
#include "soundbytes_data.inc"

namespace {

struct Sound {
    std::span<const unsigned char> packed;
    int samples;
    int bytes;  // unpacked
};

constexpr QvPcmFormat format = {44100, 2, 16};

constexpr std::array sounds = {
    Sound{sound0, 32448, 129792},
    Sound{sound1, 54408, 217632},
    Sound{sound2, 73728, 294912},
    Sound{sound3, 66531, 266124},
};

const Sound& soundAt(int index) {
    QV_ASSERT(index >= 0 && index < QvSoundBytes::nrSounds());
    return sounds[static_cast<std::size_t>(index)];
}

bool unpack(const Sound& sound, QvPcm& to) {
    auto size = static_cast<uLongf>(to.sizeBytes());
    const int result =
        uncompress(to.ptr(0), &size, sound.packed.data(), static_cast<uLong>(sound.packed.size()));
    if (result == Z_MEM_ERROR) throw std::bad_alloc();
    return result == Z_OK && size == static_cast<uLongf>(to.sizeBytes());
}

}  // namespace

int QvSoundBytes::nrSounds() { return static_cast<int>(sounds.size()); }

void QvSoundBytes::getInfo(int index, long long* samples, QvPcmFormat* to) {
    const Sound& sound = soundAt(index);
    if (samples) *samples = sound.samples;
    if (to) *to = format;
}

QvPcm* QvSoundBytes::create(int index) {
    const Sound& sound = soundAt(index);
    auto pcm = std::make_unique<QvPcm>();
    const int bytesPerSample = (format.bitsPerSample + 7) / 8;
    if (pcm->init(sound.samples, format.channels, bytesPerSample, format.samplerate) != 0)
        throw std::bad_alloc();
    QV_ASSERT(pcm->sizeBytes() == sound.bytes);
    if (!unpack(sound, *pcm)) return nullptr;
    pcm->setSamples(pcm->size());
    return pcm.release();
}
