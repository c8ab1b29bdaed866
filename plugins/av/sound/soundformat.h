// What a film's sound stream is, as it is delivered.
#pragma once

#include <cstdint>
#include <string>

namespace av {

struct SoundFormat {
    int samplerate = 0;      // Hz
    int channels = 0;        // 1 to 64
    std::uint64_t mask = 0;  // channel layout, the libraries' bits (AV_CH_...); 0: unknown
    int bits = 0;            // 8 (unsigned), 16 or 24 (three bytes); float and 32 bits are rounded to 24
    long long samples = 0;   // of the film's sound; exact
    std::string codec;       // its usual name: "AAC", "PCM", "MP3"
    int bitrate = 0;         // kbit/s; 0: unknown
    std::string lost;        // why the sound ends before the stream; "": it does not
};

}  // namespace av
