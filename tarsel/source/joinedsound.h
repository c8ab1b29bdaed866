// Several sounds side by side as one, whose channels are those of the first, then those of the next, and so
// on. It lasts as long as the longest; the others are silent after their ends.
#pragma once

#include <vector>

#include <qvplugcore/qvplugcore.h>

class JoinedSound : public QvDecodePipe {
  public:
    struct Part {
        QvDecodePipe* decoder = nullptr;  // open, the stream selected; outlives this
        int stream = 0;
    };
    // All of one rate, of 8, 16 or 24 bits. It is open.
    explicit JoinedSound(const std::vector<Part>& parts);

    using QvDecodePipe::getParam;
    const char* name() const override { return "joined sounds"; }
    int setParam(const char* name, const Any& value) override;  // of each part
    int nrStreams(int type) const override { return type == qvAudioStream ? 1 : 0; }
    void getStreamParams(int type, int stream, AnyDict& params) const override;
    int seekToSample(long long sample, int stream) override;
    int seekToFrame(long long, int) override { return QvStatus::failed; }
    int readFrame(int) override { return QvStatus::endOfStream; }
    int readSamples(int count, int stream) override;
    int nrFrames(int) const override { return 0; }
    long long nrSamples(int) const override { return samples_; }
    QvFrame* getFramePtr(int) override { return nullptr; }
    QvPcm* getAudioPtr(int) override { return &pcm_; }
    int select(int type, int) override { return type == qvAudioStream ? QvStatus::ok : QvStatus::failed; }
    int deselect(int, int) override { return QvStatus::ok; }
    int selected(AnyDict& dict) const override;
    bool isSelected(int type, int stream) const override { return type == qvAudioStream && stream == 0; }

  private:
    bool makeRoom(int count);

    std::vector<Part> parts_;
    std::vector<int> first_;  // channel of each part
    AnyDict params_;
    long long samples_ = 0, position_ = 0;
    int rate_ = 0, channels_ = 0, bytes_ = 0;  // of a value
    QvPcm pcm_;
};
