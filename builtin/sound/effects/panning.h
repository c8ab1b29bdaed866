// Module `panning`: a matrix of curves from the first eight input channels to eight output channels.
// "panning_list_0" to "panning_list_7" are the points of an input channel; each names its output channel as
// "out_ch" (0 to 7). An output that several inputs reach is their mean; an input whose level is 0 does not
// count. The output has as many channels as the input, or more if a list names a higher one.
#pragma once

#include <array>

#include "builtin/sound/effects/curvefilter.h"

class CAudioPanning : public CurveFilter {
  public:
    CAudioPanning();

    int init() override;
    int write(QvPcm& pcm) override;

  protected:
    bool setList(int channel, const AnyVector& list, const char*& why) override;
    AnyVector list(int channel) const override;

  private:
    using Curves = std::array<LevelCurve, curveChannels>;  // by output channel

    // A curve with points while it is read, of an input channel that there is.
    struct Source {
        LevelCurve::Walk walk;
        int from;
    };
    struct Mix {
        std::array<Source, curveChannels> sources;
        int count = 0;
    };
    Mix sourcesOf(int output, const QvPcm& pcm) const;
    void mixOutput(Mix& mix, const QvPcm& pcm, int* to, int step) const;

    std::array<Curves, curveChannels> curves_;  // by input channel
    int highest_ = 0;                           // output channel that any list has named since init
};
