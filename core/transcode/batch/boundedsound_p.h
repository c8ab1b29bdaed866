// A stream of another decoder that ends at a given sample, for what reads a decoder by itself. Internal to
// this folder.
#pragma once

#include <limits>

#include "core/decode/qvdecoder.h"

class BoundedSound : public QvDecodePipe {
  public:
    static constexpr long long unbounded = std::numeric_limits<long long>::max();

    BoundedSound(QvDecodePipe& source, int number) : source_(source), number_(number) {}
    void setLeft(long long samples) { left_ = samples; }  // that can still be read
    // What the source says that it still has. A read that gives less is a source that ended early.
    void setAvailable(long long samples) {
        available_ = samples;
        endedEarly_ = false;
    }
    bool endedEarly() const { return endedEarly_; }

    int setParam(const char* name, const Any& value) override { return source_.setParam(name, value); }
    int nrStreams(int type) const override { return source_.nrStreams(type); }
    void getStreamParams(int type, int stream, AnyDict& params) const override {
        source_.getStreamParams(type, stream, params);
    }
    int seekToSample(long long sample, int) override { return source_.seekToSample(sample, number_); }
    int seekToFrame(long long frame, int stream) override { return source_.seekToFrame(frame, stream); }
    int readFrame(int stream) override { return source_.readFrame(stream); }
    // Its errors are the source's.
    int readSamples(int count, int stream) override;
    int nrFrames(int stream) const override { return source_.nrFrames(stream); }
    long long nrSamples(int stream) const override { return source_.nrSamples(stream); }
    QvFrame* getFramePtr(int stream) override { return source_.getFramePtr(stream); }
    QvPcm* getAudioPtr(int) override { return atEnd_ ? nullptr : source_.getAudioPtr(number_); }
    int select(int type, int stream) override { return source_.select(type, stream); }
    int deselect(int type, int stream) override { return source_.deselect(type, stream); }
    int selected(AnyDict& dict) const override { return source_.selected(dict); }
    bool isSelected(int type, int stream) const override { return source_.isSelected(type, stream); }

  private:
    QvDecodePipe& source_;
    int number_;
    long long left_ = unbounded;
    long long available_ = 0;
    bool endedEarly_ = false;
    bool atEnd_ = false;  // nothing was read, so the source's buffer is an old one
};
