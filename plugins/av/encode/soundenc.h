// The sound encoders of the libraries, and PCM: "aacaenc" and the other rows of SoundCodec.
//
// Input: samples in the format of the settings. Output: the records of "plugins/wire.h" with
// units in elementary form (ADTS for AAC, little-endian for PCM). Samples before time 0 are encoder priming.
// close() sends the head again with what is known only then: the padding after the last sample, and extradata
// that the encoder has changed.
#pragma once

#include <string>

#include "core/encode/qvencoder.h"
#include "plugins/av/encode/soundsettings.h"
#include "plugins/av/encode/unitwriter.h"
#include "plugins/av/source/avheaders.h"

namespace av {

class SoundEnc : public QvAudioEncoder {
  public:
    explicit SoundEnc(const SoundCodec& codec) : settings_(codec) {}
    ~SoundEnc() override = default;

    using QvCodec::getParam;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    void store(AnyDict& state) const override;
    int restore(const AnyDict& state) override;
    int open() override;
    int close() override;
    int abort() override;
    int writePcm(QvPcm* pcm, int samples = -1) override;

  private:
    SoundSettings settings_;
    CodecPtr context_;
    FramePtr frame_;
    PacketPtr packet_;
    UnitWriter output_;
    int filled_ = 0;       // samples that frame_ has so far
    long long taken_ = 0;  // samples that were encoded
    long long sent_ = 0;   // samples of the units that were written, priming and padding included

    std::string prepare();
    bool sendHead(bool last);
    int putPlain(const QvPcm& pcm, int samples);
    void fill(const QvPcm& pcm, int first, int count);
    int sendFrame();
    int drain();
    int putPacket();
    void release();
};

}  // namespace av
