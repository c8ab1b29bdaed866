// Decoder "aumixdec": several files as one sound, each output channel a weighted sum of channels of them.
//
// Reads metafiles ("mmf") with an "AudioInterleave" element, or a set-up from memory; see QvAudioMixDecSetup.
// There is one stream, of 32 bits in the range of 24, as long as the longest input. Shorter inputs
// are silent after their ends.
//
// Parameters: "filename" (text) or "metaState" (Dict, what QvAudioMixDecSetup::store makes; with a file, what
// it held): the last of the two that was set counts. "targetSamplerate" (Hz, 0 at first: the highest of all
// inputs); "openParameters" and "settings" (a Dict, stored), with which the inputs are opened. Read only:
// "filesize" (Int64, of all inputs together); "inputFailure" (text, for users): why open failed, or why an
// input can't be opened. With such an input open succeeds; the stream then has no parameters and reads
// nothing.
#pragma once

#include <string>

#include "builtin/shared/metainput.h"
#include "core/decode/basedecodepipe.h"

class Interleave;

class AudioMixDec : public BaseDecodePipe {
  public:
    explicit AudioMixDec(const QvModule* module = nullptr);
    ~AudioMixDec() override;

    struct Settings {
        int targetSamplerate = 0;
    };

    using BaseDecodePipe::getParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int open() override;
    int readSamples(int count, int stream) override;
    int seekToSample(long long sample, int stream) override;
    QvPcm* getAudioPtr(int stream) override;

  private:
    MetaInput source_{true};
    Settings settings_;
    std::string inputFailure_;

    int loadSetup();
    Interleave& mixed(const char* method, int stream) const;
};
