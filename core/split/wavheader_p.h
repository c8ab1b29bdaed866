// The header of the WAV files that the split writer makes: extensible format, fact and data chunk.
#pragma once

#include <array>
#include <cstdint>

#include "core/arch/widename.h"
#include "core/stream/iofailure.h"

struct WavFormat {
    int samplerate;
    int channels;
    int bitsPerSample;
    uint32_t channelMask = 0;  // 0: not said

    int valueBytes() const { return (bitsPerSample + 7) / 8; }
    int sampleBytes() const { return valueBytes() * channels; }  // of all channels
};

constexpr unsigned wavHeaderBytes = 80;

// True for what the header's fields can state and the buffers can hold.
bool wavFormatIsLegal(const WavFormat& format);

// What lies in a file: the header, the samples, and what follows them.
struct WavExtent {
    uint64_t fileBytes;      // these 80 included
    uint64_t trailing = 0;   // of them after the samples
    bool mayBeRf64 = false;  // sizes that do not fit get 64 bits, see below
};

// The header of such a file. A size that does not fit is 0xFFFFFFFF, which readers take for a stream of
// unknown length; or the header is that of RF64, with sizes of 64 bits and the plain PCM format, which has no
// channel mask. Of the same 80 bytes it has
//     "RF64" 12   "ds64" 36   "fmt " 24   "data" 8
constexpr uint64_t wavLengthUnknown = UINT64_MAX;
std::array<unsigned char, wavHeaderBytes> wavHeader(const WavFormat& format, const WavExtent& extent);

// Writes the header over the first 80 bytes of the finished file, of which `trailing` bytes follow the
// samples. Sizes that do not fit give the user a warning. False on failure, with a note in
// `failure`.
bool writeWavHeader(const QvWideString& name, const WavFormat& format, QvIoFailure& failure,
                    uint64_t trailing = 0, bool mayBeRf64 = false);
