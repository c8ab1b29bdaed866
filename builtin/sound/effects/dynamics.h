// Module `dynamics`: limiter, compressor, expander and noise gate, one after the other, each of which can be
// off. Samples are 32 bits wide, of up to eight channels; a sound with more is refused by open, where
// the chain has set "_channels", or by write.
//
// Attack times are in microseconds, release times in milliseconds. Each stage reads the whole buffer of the
// one before, so the reader has to erase all that it has taken before the next write.
#pragma once

#include <array>

#include "builtin/sound/effects/dynamicstages.h"
#include "builtin/sound/soundfilter.h"

struct DynamicsSettings {
    bool limiter = false, compressor = false, expander = false, noisegate = false;
    double limiterLevel = -5, compressorLevel = -10, expanderLevel = -20, noisegateLevel = -35;  // dB
    double compressorRatio = 3, expanderRatio = 3;
    double limiterAttack = 1, compressorAttack = 1, expanderAttack = 1, noisegateAttack = 1;
    double limiterRelease = 1000, compressorRelease = 1000, expanderRelease = 1000, noisegateRelease = 1000;
    int channels = 0;   // of the sound, 0: not known
    double peakdB = 0;  // of the input, as reported; no stage reads it
    double peak = 0;    // the same as an amplitude
};

class Dynamics : public SoundFilter {
  public:
    Dynamics();

    // Every parameter gets its default. -1 if the filter is initialised; one that is open becomes so.
    int init() override;
    // -1 unless initialised.
    int open() override;
    // Keeps the samples that wait and the state of the stages: a later open continues with both.
    int close() override;
    // The rows and "_streamReport".
    int setParam(const char* name, const Any& value) override;
    // The rows, "paramSet" and "_needsReport".
    void getParam(const char* name, Any& value) const override;
    void store(AnyDict& dict) const override;
    int restore(const AnyDict& dict) override;
    int write(QvPcm& pcm) override;
    int erase(int n) override;

    using SoundFilter::getParam;

  private:
    static constexpr std::size_t stageCount = dynamics::stages.size();

    struct Stage {
        bool active = false;
        dynamics::Work work;
    };
    std::array<Stage, stageCount> prepare(int samplerate) const;
    int maxChannels() const override { return dynamics::maxChannels; }
    int checkChannels(int channels);
    int takeReport(const Any& report);
    int append(QvPcm& buffer, const QvPcm& like, int*& room);

    DynamicsSettings settings_;
    std::array<QvPcm, stageCount> buffers_;
    std::array<std::array<dynamics::Channel, dynamics::maxChannels>, stageCount> channels_;
};
