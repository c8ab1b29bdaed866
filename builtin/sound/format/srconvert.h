// Converts the sample rate.
//
//   "inSamplerate", "outSamplerate"   int      samples per second. Equal rates: the sound is copied
//   "splsToGet"   int      1000         output samples are made in batches of so many; 0: as many as fit into
//                                       the output's free room, with silence after the last input sample.
//                                       close sets it back
//   "splsNeed"    int      read only    while open: further input samples for one more batch. With "high" an
//                                       estimate
//   "quality"     string   "standard"   16 taps, integers; "high": libsoxr
//
// The rates and the quality hold from the first write on until close.
//
// The output begins at the time of the first input sample with either quality, and is the same whatever the
// sizes of the buffers written are. Samples are 32 bits wide, in the range of 24 bits.
#pragma once

#include <memory>

#include "builtin/sound/storedfilter.h"

namespace snd {
class Resampler;
class SampleFifo;
class SoxrRate;
}  // namespace snd

struct SrconvertSettings {
    enum Quality { standard, high };

    int inRate = 0;
    int outRate = 0;
    int batch = 1000;
    Quality quality = standard;
};

class QvSamplerate2 : public StoredFilterOf<SrconvertSettings> {
  public:
    QvSamplerate2();
    ~QvSamplerate2() override;

    int open() override;
    int close() override;
    void getParam(const char* name, Any& value) const override;
    int write(QvPcm& pcm) override;

    using StoredFilterOf::getParam;

  private:
    int noRoom(long long samples);
    int startOutput(const QvPcm& pcm);
    int startResampler(int channels);
    int writeEqual(const QvPcm& pcm);
    int writeStandard(const QvPcm& pcm);
    int writeWhole(const QvPcm& pcm);
    int writeHigh(const QvPcm& pcm);
    long long makeBatches(int32_t* room);
    QvPcmFormat outputFormat(const QvPcm& pcm) const;
    int missingInput() const;

    std::unique_ptr<snd::Resampler> resampler_;
    std::unique_ptr<snd::SampleFifo> fifo_;
    std::unique_ptr<snd::SoxrRate> soxr_;
    long long samplesIn_ = 0, samplesOut_ = 0;
};
