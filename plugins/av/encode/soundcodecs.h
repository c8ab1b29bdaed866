// The sound encoders: one row each.
#pragma once

#include <span>

#include "plugins/av/source/avheaders.h"

namespace av {

struct SoundCodec {
    const char* module;
    const char* encoder;  // the libraries' name; "" for PCM
    unsigned fourcc;      // of the units; see plugins/wire.h
    const char* extension;
    std::span<const int> rates;     // Hz
    std::span<const int> kilobits;  // bit rates, kbit/s; none where the size depends on the sound
    std::span<const int> channels;
    int defaultKilobits;
    std::span<const int> lowKilobits = {};  // at the sample rates below those of MPEG-1; none: the same

    // Those of the bit rates that are valid for this sample rate and number of channels.
    std::span<const int> kilobitsFor(int samplerate, int channelCount) const;
    const AVCodec* library() const { return avcodec_find_encoder_by_name(encoder); }
};

// Null if there is none.
const SoundCodec* soundCodec(const char* module);

}  // namespace av
