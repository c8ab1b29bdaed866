// Decoder "wavdec": PCM of 8, 16 or 24 bits from RIFF WAVE files, RF64 included.
#pragma once

#include "builtin/decoders/inputfile.h"
#include "builtin/decoders/wavf.h"
#include "core/decode/basedecodepipe.h"

class WavStream : public DPipeAudioStream {
  public:
    WavStream(InputFile file, const WavHeader& header);

    int read(int count);         // as readSamples; QvStatus::cannotParse when the file gives nothing
    int seek(long long sample);  // QvStatus::endOfStream when the file does not move

    const WavHeader& header() const { return header_; }

  private:
    WavHeader header_;
    InputFile file_;
};

// One audio stream. A file that was cut delivers what is there, see "truncated" in the contract.
class WavDec : public BaseDecodePipe {
  public:
    using BaseDecodePipe::BaseDecodePipe;

    using BaseDecodePipe::getParam;
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int seekToSample(long long sample, int stream) override;
    int readSamples(int count, int stream) override;
    QvPcm* getAudioPtr(int stream) override;

  private:
    long long fileSize_ = 0;

    WavStream& wavStream(int stream) const;
};
