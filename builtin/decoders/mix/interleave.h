// The output stream of the decoder "aumixdec": opens the inputs of a set-up and mixes them.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "core/compose/qvaudiomix.h"
#include "core/compose/qvaudiomixdecsetup.h"
#include "core/decode/basedecodepipe.h"

class ADecStream;

class Interleave : public DPipeAudioStream {
  public:
    Interleave();
    ~Interleave() override;

    QvAudioMixDecSetup setup;

    // Opens the inputs with `inputParams`, which may be empty. `targetRate`: Hz; 0 for the highest of all
    // inputs. 0, also if a file can't be opened: then the stream has no parameters and read() fails.
    // Otherwise a status, with a text in error().
    int prepare(int targetRate, const AnyDict& inputParams = {});
    const std::string& error() const { return error_; }
    // For users: why an input or the mix is not possible; empty if there is no such reason.
    const std::string& inputFailure() const { return inputFailure_; }

    // Reads into `pcm` and returns the number of samples. The last read may give up to two more than the
    // stream has. -4 after the end; -1 if no input can be read.
    int read(int count);
    int seek(long long sample);  // 0 or -4

  private:
    QvAudioMix mix_;
    std::vector<std::unique_ptr<QvDecodePipe>> decoders_;
    std::vector<std::unique_ptr<ADecStream>> inputs_;
    TPtrList<QvPcm> buffers_;  // of the inputs
    long long samples_ = 0;
    long long position_ = -1;  // the last sample that was read
    std::string error_;
    std::string inputFailure_;

    void release();
    bool openDecoders(const Any* params);
    std::unique_ptr<QvDecodePipe> openDecoder(int file, const Any* params);
    int chooseRate(int targetRate) const;
    int selectStreams(int rate);
    int setUpMix();
    int setSource(int out, const AnyDict& source);
    int publishParams(int rate);
    int indexOf(const Any& file, int stream) const;
    int fail(int code, const char* text);
    int stop(int result);
};
