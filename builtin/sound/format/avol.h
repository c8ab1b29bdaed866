// Changes the level, of all channels and of each of the first eight.
//
//   "volume"             float   0   dB
//   "mute"               int     0   flag
//   "channelN_volume"    float   0   dB, added to "volume"; N from 1 to 8
//   "channelN_mute"      int     0   flag
//   "precision"          int     5   fraction bits of the gain, 5 or 16
//
// With 5 fraction bits the gain is at most 6 dB, and a product that does not fit 32 bits wraps around. With
// 16 it is at most 48 dB, the product is rounded to the nearest and takes the nearest bound. The gains change
// with the next write after a parameter. Samples are 32 bits wide; channels from the ninth on become silent,
// with one warning per open.
//
// "paramSet" describes the parameters of the channels. "_streamReport" is taken without effect, and
// "_needsReport" is 0: the filter needs no report.
#pragma once

#include <array>
#include <cstdint>
#include <vector>

#include "builtin/sound/storedfilter.h"

struct AVolSettings {
    static constexpr int channels = 8;

    double volume = 0;
    bool mute = false;
    double volume1 = 0, volume2 = 0, volume3 = 0, volume4 = 0, volume5 = 0, volume6 = 0, volume7 = 0,
           volume8 = 0;
    bool mute1 = false, mute2 = false, mute3 = false, mute4 = false, mute5 = false, mute6 = false,
         mute7 = false, mute8 = false;
    int precision = 5;
    double peakLevel = 0;  // dB, of the stream report
};

class QvAVol : public StoredFilterOf<AVolSettings> {
  public:
    QvAVol();

    int init() override;
    int open() override;
    int setParam(const char* name, const Any& value) override;
    void getParam(const char* name, Any& value) const override;
    // "volume", "mute" and "type", of the others those that were changed.
    void store(AnyDict& dict) const override;
    int restore(const AnyDict& dict) override;
    int write(QvPcm& pcm) override;

    using StoredFilterOf::getParam;

  private:
    int maxChannels() const override { return AVolSettings::channels; }
    void computeGains();
    void spreadGains(int channels);

    std::array<int32_t, AVolSettings::channels> gains_{};
    std::vector<int32_t> period_;  // the gains of several samples, value by value; empty: to be made
};
