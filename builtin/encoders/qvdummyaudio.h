// DummyAudioEnc: hands PCM to a multiplexer that takes it without a bitstream. Module "dummyaenc".
#pragma once

#include "core/encode/qvencoder.h"
#include "core/engine/modules/qvmodule.h"
#include "core/value/anycontainer.h"

class QvMuxer;

// Everything about the sound is the multiplexer's matter: parameters are passed to it, and held back until
// there is one.
class DummyAudioEnc : public QvAudioEncoder {
  public:
    DummyAudioEnc() = default;

    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    using QvCodec::getParam;
    // -1 unless the stream belongs to a multiplexer.
    int attachOutStream(QvBufStream* stream) override;
    int detachOutStream() override;
    int open() override;
    int close() override;
    int writePcm(QvPcm* pcm, int samples = -1) override;

  private:
    QvMuxer* muxer_ = nullptr;
    AnyDict waiting_;
};
