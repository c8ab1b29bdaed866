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

    // Opens the inputs. `targetRate`: Hz; 0 for the highest of all inputs.
    // `inputParams`: with which they are opened; may be empty. 0, also when a file can't be
    // opened: then there are no parameters, and nothing is read. Otherwise a status, of which error() is the
    // text.
    int prepare(int targetRate, const AnyDict& inputParams = {});
    const std::string& error() const { return error_; }
    // Why the inputs are not as the set-up says, for users; empty if they are.
    const std::string& inputFailure() const { return inputFailure_; }

    // Number of samples that are then in `pcm`. The last read may give up to two more than the stream has.
    // -4 after the end; -1 if no input can be read.
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
    int publish(int rate);
    int indexOf(const Any& file, int stream) const;
    int fail(int code, const char* text);
    int stop(int result);
};
