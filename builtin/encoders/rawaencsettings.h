// Parameters of the raw audio encoder: the format of the sound, and what follows from it.
#pragma once

#include <span>

#include "core/value/any.h"

template <class T>
struct QvParamRow;

struct RawAudioSettings {
    int samplerate = 48000;  // 1 to 1,000,000 Hz
    int channels = 2;        // 1 to 32
    int bitsPerSample = 16;  // 1 to 32
    int profile = -1;
    int type = 0;  // taken and not used

    int bytesPerSample() const { return channels * ((bitsPerSample + 7) / 8); }  // of all channels
    long long bitrate() const { return 8LL * samplerate * bytesPerSample(); }    // bits a second

    // All parameters but "settings". A profile of a broadcast family sets 48 kHz and 24 bits.
    static std::span<const QvParamRow<RawAudioSettings>> rows();
};
