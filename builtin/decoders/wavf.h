// The header of a RIFF WAVE file.
//
//     "RIFF" size "WAVE"                 or "RF64", "BW64": sizes of 64 bits in a chunk "ds64"
//     chunk*                             id, 32-bit size, contents, one byte of padding if the size is odd
//     "fmt " size format fields
//     anything
//     "data" size interleaved samples
//     chunk*
//
// A size that a recorder did not correct after it wrote the header means "to the end of the file". A size
// beyond the end is cut to what is there.
//
// Plain files have PCM of 8, 16 or 24 bits, up to 8 channels, and "RIFF". The extended reading also takes
// other codings and widths, more channels, 64-bit sizes, and "RIFX", where all numbers are big-endian. "data"
// may follow any number of chunks, and chunks before "fmt " may be empty.
#pragma once

#include <string>
#include <vector>

class InputFile;

enum class WavStatus {
    ok = 0,
    cannotOpen = 1,
    notPcm = 2,     // a coding that can't be read
    badFormat = 3,  // a count of channels, a rate or a width that can't be read
    cannotParse = 4,
    noData = 9,  // no "data" soon after the format; counts as one that can't be parsed
};

enum class WavCoding { integer, floating, aLaw, muLaw };

constexpr int wavMostChannels = 256;  // of the extended reading

struct WavHeader {
    long long fileSize = 0;          // bytes, as the RIFF header states, at most the real size
    int channels = 0;                // 1 .. 8, extended 1 .. wavMostChannels
    int samplerate = 0;              // above 0
    long long samples = 0;           // that the file holds
    long long samplesAnnounced = 0;  // at least `samples`; more in a file that was cut
    int bitsPerSample = 0;           // 8, 16 or 24; extended 1 .. 32, and 64 of floating point
    int formatTag = 0;               // 65534 for extensible
    unsigned channelMask = 0;        // of the extensible format, else 0
    WavCoding coding = WavCoding::integer;
    bool bigEndian = false;
    long long dataOffset = 0;  // bytes from the start of the file
    long long dataEnd = 0;     // where the samples end, before any padding

    int valueBytes() const { return (bitsPerSample + 7) / 8; }  // in the file; narrower values are upper bits
    int frameBytes() const { return channels * valueBytes(); }  // of one sample of every channel
    bool truncated() const { return samplesAnnounced > samples; }
};

// Reads the header from an open file. `header` is whole only with WavStatus::ok.
WavStatus readWavHeader(InputFile& file, WavHeader& header, bool extended);

struct WavChunk {
    std::string id;    // four bytes
    std::string data;  // without its padding
};

// The chunks before and after the samples, in their order. Texts and markers ("bext", "iXML", "cue ", and
// "LIST" of INFO and adtl) go to `kept`, the ids of the others to `others`, except those that describe the
// file itself or fill it up. A big-endian file has big-endian numbers in its chunks, so only its iXML is
// kept. A chunk that would take the kept ones beyond 16 MiB is not kept.
void readWavChunks(InputFile& file, const WavHeader& header, std::vector<WavChunk>& kept,
                   std::vector<std::string>& others);
