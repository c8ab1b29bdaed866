// Decoder "testgen": test pictures and beeps without a file. See core/decode/qvtestgenerator.h.
#pragma once

#include <memory>
#include <vector>

#include "builtin/decoders/audiogenerator.h"
#include "builtin/decoders/videogenerator.h"
#include "core/decode/qvdecoder.h"

class GeneratorPipe : public QvDecodePipe {
  public:
    using QvDecodePipe::QvDecodePipe;
    ~GeneratorPipe() override;

    using QvDecodePipe::getParam;
    using QvDecodePipe::getStreamParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    int restore(const AnyDict& state) override;
    // QvStatus::invalidStructure without any stream. Streams that can't be set up are left out.
    int open() override;
    int close() override;

    int nrStreams(int type) const override;
    void getStreamParam(int type, int stream, const char* name, Any& value) const override;
    void getStreamParams(int type, int stream, AnyDict& params) const override;
    int seekToSample(long long sample, int stream) override;
    int seekToFrame(long long frame, int stream) override;
    int readFrame(int stream) override;
    int readSamples(int count, int stream) override;
    int nrFrames(int stream) const override;
    long long nrSamples(int stream) const override;
    QvFrame* getFramePtr(int stream) override;
    QvPcm* getAudioPtr(int stream) override;
    int select(int type, int stream) override;
    int deselect(int type, int stream) override;
    int selected(AnyDict& dict) const override;
    bool isSelected(int type, int stream) const override;
    AnyVector overridableParams(int type, int stream) override;
    int setOverride(int type, int stream, const char* name, const Any& value) override;

  private:
    std::vector<std::unique_ptr<VideoGenerator>> videos_;
    std::vector<std::unique_ptr<AudioGenerator>> audios_;
    AnyDict streams_;
    Any mode_;

    GeneratorStream* find(int type, int stream) const;  // null when absent
    // The stream for an operation that needs an open one; otherwise the error is set and it asserts.
    VideoGenerator& video(int stream, const char* operation) const;
    AudioGenerator& audio(int stream, const char* operation) const;
    [[noreturn]] void refuse(const char* format, const char* operation) const;
    void makeStreams();
    void dropStreams();
    int overrideVideo(int stream, const char* name, const Any& value);
    int overrideDuration(const Any& value);
};
