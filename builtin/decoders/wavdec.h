// Decoder "wavdec": sound from RIFF WAVE files, PCM of 8, 16 or 24 bits and up to 8 channels.
//
// Parameters: "source" (in the place of the file, see QvByteSource; it has to know its size and to be
// sought); "extended" (stored, off at first; counts at the next open) also reads RF64, BW64 and RIFX, up to
// 256 channels, and these values:
//
//     in the file                      delivered
//     PCM of 1 to 24 bits              8, 16 or 24 bits; narrow values are the upper bits of their bytes
//     PCM of 25 to 32 bits             24 bits in three bytes, rounded
//     floating point, 32 and 64 bits   24 bits in three bytes, rounded; beyond full scale clipped
//     A-law, mu-law                    16 bits
//
// "openParameters" and "settings" (a Dict of these). Read only, of an open file with "extended": "chunks" (a
// Vector of Dict with "id", String of four bytes, and "data", Generic) has the words and marks of the file,
// see QvWavChunks; "otherChunks" (a Vector of String) has the ids of what else there is around the samples.
//
// The stream then has "sourceFormat" (String, for people) where the file has other values than those
// delivered; "channelMask" (Int64) where it names the places of its channels; and, after the first of them
// was read, "clippedSamples" (Int64), the values that were clipped. A part that is read again is not counted
// again, nor what lies outside of "clipRange" (a Vector of two Int64 of an open file: a sample, and the one
// after the last; all of them at first). Closing the stream logs their number as a warning.
#pragma once

#include <climits>
#include <string>
#include <vector>

#include "builtin/decoders/inputfile.h"
#include "builtin/decoders/wavf.h"
#include "builtin/decoders/wavvalues.h"
#include "core/decode/basedecodepipe.h"

class WavStream : public DPipeAudioStream {
  public:
    WavStream(InputFile file, const WavHeader& header, bool extended);

    int read(int count);         // as readSamples; QvStatus::cannotParse when the file gives nothing
    int seek(long long sample);  // QvStatus::endOfStream when the file does not move
    std::string problem() const { return file_.problem(); }

    const WavHeader& header() const { return header_; }
    long long clipped() const { return clipped_; }
    void countClippedWithin(long long from, long long to);

  private:
    WavHeader header_;
    InputFile file_;
    wav::Convert convert_ = nullptr;     // null: what is read is delivered
    std::vector<unsigned char> stored_;  // values as the file has them, on their way through convert_
    long long clipped_ = 0;              // values
    long long counted_ = 0;              // before this sample the clipped values are counted, or do not count
    long long countEnd_ = LLONG_MAX;     // nor do those from this one on

    int readPlain(int count);
    int readConverted(int count);
};

// One audio stream. A file that was cut delivers what is there, see "truncated" in the contract.
class WavDec : public BaseDecodePipe {
  public:
    using BaseDecodePipe::BaseDecodePipe;

    struct Settings {
        QvByteSource* source = nullptr;  // borrowed; null: the file
        bool extended = false;
    };

    using BaseDecodePipe::getParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int close() override;
    int seekToSample(long long sample, int stream) override;
    int readSamples(int count, int stream) override;
    QvPcm* getAudioPtr(int stream) override;

  private:
    Settings settings_;
    long long fileSize_ = 0;
    std::vector<WavChunk> chunks_;
    std::vector<std::string> otherChunks_;

    WavStream& wavStream(int stream) const;
    int setAll(const Any& value);
    int setClipRange(const Any& value);
};
