// Module `audiolevel`: the level of each of the first eight channels follows a curve. "volume_list_0" to
// "volume_list_7" are the points of the channels' curves.
#pragma once

#include <array>

#include "builtin/sound/effects/curvefilter.h"

class CustomAudioVolume : public CurveFilter {
  public:
    CustomAudioVolume();

    int close() override;
    int write(QvPcm& pcm) override;

  protected:
    bool setList(int channel, const AnyVector& list, const char*& why) override;
    AnyVector list(int channel) const override;

  private:
    void applyCurve(const QvPcm& pcm, int channel, int* to) const;

    std::array<LevelCurve, curveChannels> curves_;
};
