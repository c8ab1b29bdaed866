// The header of a RIFF WAVE file.
//
//     "RIFF" size "WAVE"                 or "RF64", "BW64": sizes of 64 bits in a chunk "ds64"
//     chunk*                             id, 32-bit size, contents, one byte of padding if the size is odd
//     "fmt " size format fields
//     anything
//     "data" size interleaved samples
//
// Sizes that a recorder could not know when it wrote the header mean "to the end of the file", and a size
// beyond the end is cut to what is there.
#pragma once

class InputFile;

enum class WavStatus {
    ok = 0,
    cannotOpen = 1,
    notPcm = 2,     // neither PCM nor extensible PCM
    badFormat = 3,  // a count of channels, a rate or a width that can't be read
    cannotParse = 4,
    noData = 9,  // no "data" soon after the format; counts as one that can't be parsed
};

struct WavHeader {
    long long fileSize = 0;          // bytes, as the RIFF header says, but never more than there are
    int channels = 0;                // 1 .. 8
    int samplerate = 0;              // above 0
    long long samples = 0;           // that the file holds
    long long samplesAnnounced = 0;  // at least `samples`; more in a file that was cut
    int bitsPerSample = 0;           // 8, 16 or 24
    int formatTag = 0;               // 1, or 65534 for extensible
    unsigned channelMask = 0;        // of the extensible format, else 0
    long long dataOffset = 0;        // bytes from the start of the file

    int frameBytes() const { return channels * (bitsPerSample / 8); }  // of one sample of every channel
    bool truncated() const { return samplesAnnounced > samples; }
};

// Reads the header from an open file. `header` is whole only with WavStatus::ok.
WavStatus readWavHeader(InputFile& file, WavHeader& header);
