// The decoder that the links of a push encoder pull from.
#pragma once

#include <vector>

#include "core/decode/basedecodepipe.h"

class IAVFeed;

class PushInput final : public BaseDecodePipe {
  public:
    explicit PushInput(IAVFeed& feed) : feed_(feed) {}
    ~PushInput() override;

    using BaseDecodePipe::getParam;
    using BaseDecodePipe::getStreamParam;
    // The parameters of a stream to come, as getStreamParams answers them.
    void addVideo(const AnyDict& params) { videos_.push_back(params); }
    void addAudio(const AnyDict& params) { audios_.push_back(params); }

    int open() override;
    int readFrame(int stream) override;
    int readSamples(int count, int stream) override;
    QvFrame* getFramePtr(int stream) override;
    QvPcm* getAudioPtr(int stream) override;

  private:
    int openVideo(const AnyDict& params);
    int openAudio(const AnyDict& params);
    DPipeVideoStream& video(int stream) const;
    DPipeAudioStream& audio(int stream) const;

    IAVFeed& feed_;
    std::vector<AnyDict> videos_;
    std::vector<AnyDict> audios_;
};
