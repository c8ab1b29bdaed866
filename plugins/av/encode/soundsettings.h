// Parameters of the sound encoders.
#pragma once

#include <span>
#include <string>

#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"
#include "plugins/av/encode/soundcodecs.h"

namespace av {

struct SoundSettings {
    explicit SoundSettings(const SoundCodec& row) : codec(&row), kilobits(row.defaultKilobits) {}

    const SoundCodec* codec;
    int samplerate = 48000;  // Hz
    int channels = 2;
    int bits = 16;        // of the input samples
    int profile = -1;     // number of a preset; -1: none
    int threads = 0;      // of the codec; 0: one per core
    int kilobits;         // wanted bit rate, kbit/s; see bitsPerSecond
    std::string options;  // of the library

    // The bit rate that is used: the valid one nearest to `kilobits`, or that of PCM where the codec has
    // none.
    double bitsPerSecond() const;
    // Whether the bit rate was set to another value than the default.
    bool hasOwnBitrate() const { return !codec->kilobits.empty() && kilobits != codec->defaultKilobits; }
    static std::span<const QvParamRow<SoundSettings>> rows();
};

}  // namespace av
