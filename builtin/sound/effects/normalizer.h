// Module `normalizer`: one gain for the whole sound, so that its peak, RMS or loudness is a given one.
//
// The gain comes from the report on the sound that reaches the filter (QvProcessUtil::applyStreamReport),
// which has to be set before open. Where the gain would lift the true peak above `truePeak` it is lowered
// until the peak stands there, and a warning says what is reached. Silence, and a sound without a report,
// which is also a warning, pass unchanged. Samples are 32 bits wide.
#pragma once

#include <optional>
#include <string>

#include "builtin/sound/storedfilter.h"

// The default target of the peak leaves room for true peaks above it, so that the gain is rarely lowered.
struct NormalizerSettings {
    enum class Mode { peak, rms, loudness };

    Mode mode = Mode::peak;
    std::optional<double> target;  // dBFS, or LUFS for loudness; unset: the default of the mode
    double truePeak = -1;          // dBTP
    double gain = 0;               // dB, of the last open
};

class QvNormalizer : public StoredFilterOf<NormalizerSettings> {
  public:
    QvNormalizer();

    int open() override;
    // The rows and "_streamReport", a Dict.
    int setParam(const char* name, const Any& value) override;
    // The rows and "_needsReport".
    void getParam(const char* name, Any& value) const override;
    void store(AnyDict& dict) const override;
    int write(QvPcm& pcm) override;

    using StoredFilterOf::getParam;

  private:
    double chooseGain() const;  // dB

    AnyDict report_;
    double factor_ = 1;
};
