// A multiplexer that takes every parameter, answers with what it was given, and has at most one video stream.
#pragma once

#include "core/encode/qvmuxer.h"
#include "tests/support/fake_streams.h"

class FakeMuxer : public FakeEncoder<QvMuxer> {
  public:
    explicit FakeMuxer(const char* name, QvBufStream* video = nullptr) : name_(name), video_(video) {}
    const char* name() const override { return name_; }
    QvBufStream* addStream(int, const AnyDict&) override { return nullptr; }
    void removeStreams(int) override {}
    void removeStream(int, int) override {}
    int nrStreams(int type) const override { return type == 1 && video_ ? 1 : 0; }
    QvBufStream* stream(int, int) const override { return video_; }

  private:
    const char* name_;
    QvBufStream* video_;
};
