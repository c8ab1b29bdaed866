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

    int valueBytes() const { return (bitsPerSample + 7) / 8; }
    int sampleBytes() const { return valueBytes() * channels; }  // of all channels
};

constexpr unsigned wavHeaderBytes = 80;

// True for what the header's fields can state and the buffers can hold.
bool wavFormatIsLegal(const WavFormat& format);

// The header of a file of `fileBytes`, these 80 included. A size that does not fit is 0xFFFFFFFF, which
// readers take for a stream of unknown length.
constexpr uint64_t wavLengthUnknown = UINT64_MAX;
std::array<unsigned char, wavHeaderBytes> wavHeader(const WavFormat& format, uint64_t fileBytes);

// Writes the header over the first 80 bytes of the finished file. A file beyond 4 GiB is told to the user as
// a warning. False on failure, with a note in `failure`.
bool writeWavHeader(const QvWideString& name, const WavFormat& format, QvIoFailure& failure);
