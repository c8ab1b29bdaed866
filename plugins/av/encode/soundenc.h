// The sound encoders over the libraries, and PCM as it is: "aacaenc" and the other rows of SoundCodec.
//
// Samples of the set format come in; units in elementary form (ADTS for AAC, low byte first for PCM) go out
// with the records of "plugins/wire.h". Priming has times below 0. The head is sent again at close where
// padding follows the last sample, or the codec's own data are known only then.
#pragma once

#include <cstdint>
#include <span>
#include <string>

#include "core/encode/qvencoder.h"
#include "core/engine/modules/params.h"
#include "core/measure/qvgeometry.h"
#include "plugins/av/encode/unitwriter.h"
#include "plugins/av/source/avheaders.h"

namespace av {

struct SoundCodec {
    const char* module;
    const char* encoder;  // the libraries' name; "" for PCM
    const char* fourcc;
    const char* extension;
    std::span<const int> rates, kilobits;  // without bit rates: the size follows from the sound
    std::span<const int> channels;
    int usualKilobits;
    std::span<const int> lowKilobits = {};  // of rates below those of MPEG-1, where these are others
    const AVCodec* library() const { return avcodec_find_encoder_by_name(encoder); }
};
const SoundCodec* soundCodec(const char* module);

struct SoundSettings {
    explicit SoundSettings(const SoundCodec& row) : codec(&row), kilobits(row.usualKilobits) {}

    const SoundCodec* codec;
    int samplerate = 48000, channels = 2, bits = 16, profile = -1, threads = 0;
    int kilobits;  // that are wanted; the nearest of those that the rate has is used
    std::string options;

    // The bit rate was asked for, as far as can be known.
    bool stated() const { return !codec->kilobits.empty() && kilobits != codec->usualKilobits; }
    static std::span<const QvParamRow<SoundSettings>> rows();
};

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
    int filled_ = 0;                  // samples of the frame that is being filled
    long long taken_ = 0, sent_ = 0;  // samples in, and in units

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
